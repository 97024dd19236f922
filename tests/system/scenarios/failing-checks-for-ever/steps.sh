# cron runs, but its check fails and no recovery helps. It is given up, though its general pings are
# good; the next refresh revives the watch, and finds it well.
speed=40
refresh=900
start cron
cron=$(pid_of cron)
echo 'error: nothing works' >/run/answer
watch
await 'Failed to functional recover the sevice cron after try the max times.'
was_restarted cron "$cron"
echo 'service: fine' >/run/answer
await 'join threadas*'
! head -n "$cursor" "$log" | grep -qF 'Functionalping result correct' || fail 'it went on by itself'
await 'Functionalping result correct functional ping'
unwatch
