# Two services depend on redis-server, one with commands of its own. They are stopped and started in
# the order of the configuration. A third service that the configuration does not name is left alone.
start redis-server nginx cron
invent neighbour
start neighbour
redis=$(pid_of redis-server) nginx=$(pid_of nginx) cron=$(pid_of cron) neighbour=$(pid_of neighbour)
watch
await 'General ping successful!'
slay redis-server
await 'has been general recoverred successfully.'
unwatch
was_restarted redis-server "$redis"
was_restarted nginx "$nginx"
was_restarted cron "$cron"
is "$neighbour" "$(pid_of neighbour)"
