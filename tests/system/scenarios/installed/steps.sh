# With installation and marker there, an installer's pid file is of no interest.
start cron
echo 1 >/run/breminstall.pid
watch
await 'General ping successful!'
unwatch
