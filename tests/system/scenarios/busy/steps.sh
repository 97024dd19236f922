# redis-benchmark keeps redis-server busy beyond its CPU threshold: two checks in a row are skipped,
# the third is made, and so on. When the load ends, so does the skipping.
speed=10
start redis-server
watch
await 'Functionalping result correct functional ping'
redis-benchmark -q -l -P 100 -t get >/dev/null &
load=$!
await 'Skipping functional ping. 2 FPs skipped so far.'
await 'Can not skip Functional ping now, max skip count reached'
await 'Skipping functional ping. 2 FPs skipped so far.'
kill -KILL "$load"
wait "$load" || true
await ') Threshold is not reached'
await 'Functionalping result correct functional ping'
unwatch
