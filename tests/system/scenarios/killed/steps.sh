# redis-server, on which nginx depends, is killed while its checks go well. It is missed, tried
# three times, and recovered together with nginx. cron, which does not depend on it, is left alone.
start redis-server nginx cron
redis=$(pid_of redis-server) nginx=$(pid_of nginx) cron=$(pid_of cron)
watch
await 'Functionalping result correct functional ping'
await 'General ping sleep 60'
slay redis-server
await 'has been general recoverred successfully.'
unwatch
was_restarted redis-server "$redis"
was_restarted nginx "$nginx"
is "$cron" "$(pid_of cron)"
is PONG "$(redis-cli ping)"
