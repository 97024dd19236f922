# The folder of the pings' output cannot be written. What the last ping left there still decides, so
# cron counts as running; web, of which there is nothing, fails.
invent web
start cron web
echo 'cron is running' >"$ping_folder/agent.cron"
mount --bind "$ping_folder" "$ping_folder"
mount -o remount,bind,ro "$ping_folder"
watch
until_true grep -qsF 'agent.cron, result = cron is running, state = 2' "$log"
until_true grep -qF 'Try to general ping more times now' "$log"
unwatch
