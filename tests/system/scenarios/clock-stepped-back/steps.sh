# Somebody sets the clock back by a day: pauses are as long as before, outages are found and
# mended, and a negative CPU figure is no load.
start redis-server
redis=$(pid_of redis-server)
FAKETIME_TIMESTAMP_FILE=/run/clock
export FAKETIME_TIMESTAMP_FILE FAKETIME_NO_CACHE=1
echo '+0 x20' >/run/clock
speed='file'
watch
await 'Threshold is not reached'
await 'Threshold is not reached'
echo '-1d x20' >/run/clock.new && mv /run/clock.new /run/clock
await 'averageCPUUsage/Threshold:'
await 'averageCPUUsage/Threshold:'
await 'Threshold is not reached'
slay redis-server
await 'has been general recoverred successfully.'
unwatch
was_restarted redis-server "$redis"
before=$(head -n 1 "$log" | cut -c 1-24)
after=$(tail -n 1 "$log" | cut -c 1-24)
[ "$(date -d "$after" +%s)" -lt "$(date -d "$before" +%s)" ] || fail 'the clock was not set back'
