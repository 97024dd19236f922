# The reader of standard output ends: the daemon does not.
start cron
mkfifo /run/pipe
head -n 1 /run/pipe >/opt/results/first &
become_tolkwd -i "$configuration" -l "$log" -g >/run/pipe 2>"$errors" &
daemon=$!
wait %1
await 'General ping successful!'
await 'General ping successful!'
stop cron
await 'has been general recoverred successfully.'
unwatch
up cron || fail 'cron was not recovered'
is "$(head -n 1 "$log")" "$(cat /opt/results/first)"
