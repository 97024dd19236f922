# An operator restarts redis-server between two checks: the figures are taken from the new process
# alone, though the old one has used a lot of CPU time.
start redis-server
redis-benchmark -q -n 200000 -P 100 -t get >/dev/null
before=$(pid_of redis-server)
watch
await "PID changed (old = -1, new = $before)"
await 'Functionalping result correct functional ping'
stop redis-server
start redis-server
after=$(pid_of redis-server)
await "PID changed (old = $before, new = $after)"
await ') Threshold is not reached'
unwatch
