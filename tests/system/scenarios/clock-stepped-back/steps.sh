# Somebody sets the clock back by an hour, while redis-server is busy: the CPU figure of that time is
# negative, and no load. Pauses are as long as before; outages are found and mended.
start redis-server
redis=$(pid_of redis-server)
FAKETIME_TIMESTAMP_FILE=/run/clock
export FAKETIME_TIMESTAMP_FILE FAKETIME_NO_CACHE=1
echo '+0 x20' >/run/clock
speed='file'
watch
await 'Threshold is not reached'
redis-benchmark -q -l -P 100 -t get >/dev/null &
load=$!
await 'Threshold is reached'
echo '-1h x20' >/run/clock.new && mv /run/clock.new /run/clock
await 'averageCPUUsage/Threshold:-'
await 'Threshold is not reached'
kill -KILL "$load"
wait "$load" || true
slay redis-server
await 'has been general recoverred successfully.'
unwatch
was_restarted redis-server "$redis"
