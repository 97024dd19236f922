# No thread can be made when a generation starts: nothing is watched, nothing is logged of it, and
# the daemon runs on. The next refresh finds that threads can be made again.
speed=40
refresh=120
invent web
start web
as_nobody prlimit --nproc=0:1000
watch
await '******************************:web'
await 'join threadas*'
lacks "$log" 'thread created...'
lacks "$log" 'thread is joined...'
limit_processes 1000
await 'Name of the service being monitored: web'
await 'General ping successful!'
unwatch
