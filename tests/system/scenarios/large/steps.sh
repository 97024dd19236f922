# redis-server has more threads than its threshold, and cron more memory: their checks are left out
# as often as allowed.
start redis-server cron
watch
until_true more_than 1 '(/usr/bin/redis-server) Can not skip Functional ping now' "$log"
until_true more_than 1 '(/usr/sbin/cron) Can not skip Functional ping now' "$log"
unwatch
