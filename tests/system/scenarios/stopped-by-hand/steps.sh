# An operator stops cron and forgets it. Its status command says that it does not run, so nothing
# is stopped, and it is started again.
start cron
watch
await 'General ping successful!'
stop cron
await 'has been general recoverred successfully.'
unwatch
up cron || fail 'cron does not run'
