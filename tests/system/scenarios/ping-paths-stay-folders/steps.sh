# Where a status command and a check should write there are folders, and nobody removes them. The
# shell runs neither command and gives 2: both services are well, and both are restarted.
invent web
start cron web
cron=$(pid_of cron) web=$(pid_of web)
mkdir "$ping_folder/agent.cron" "$ping_folder/agent.functionalping.web"
watch
until_true more_than 1 'Exit of general recover after release write lock' "$log"
unwatch
was_restarted cron "$cron"
was_restarted web "$web"
lacks /opt/results/journal 'service cron status'
[ ! -e /run/checked ] || fail 'the check has run'
