# Standard output takes nothing, as a full disk does.
start cron
become_tolkwd -i "$configuration" -l "$log" -g >/dev/full 2>"$errors" &
daemon=$!
await 'General ping successful!'
await 'General ping successful!'
stop cron
await 'has been general recoverred successfully.'
unwatch
up cron || fail 'cron was not recovered'
