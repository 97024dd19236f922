# nginx is killed, and an operator starts it again while the daemon still retries: nothing more is
# done, and this round has no check.
speed=10
start nginx
watch
await 'General ping successful!'
slay nginx
await 'General ping will be tried 2 more time(s)'
start nginx
nginx=$(pid_of nginx)
await 'General ping sleep 10'
await 'Functionalping result correct functional ping'
unwatch
is "$nginx" "$(pid_of nginx)"
