# redis-server hangs: it is there, so its status is good, but it answers nobody. Only the check finds
# it. Its own stop command would wait for ever for a process that does not run, so the configuration
# has one that kills.
start redis-server cron
redis=$(pid_of redis-server) cron=$(pid_of cron)
watch
await 'Functionalping result correct functional ping'
kill -STOP "$redis"
await 'has been successfully functional recovered.'
unwatch
was_restarted redis-server "$redis"
was_restarted cron "$cron"
is PONG "$(redis-cli ping)"
