# The programs of two checks are missing. Of the one that stands alone, the sh of Debian says only
# "not found", which is a failure, and the healthy service is restarted. timeout reports the other
# one in words that are known: nothing is recovered.
invent web
start cron web
cron=$(pid_of cron) web=$(pid_of web)
watch
await 'Functionalping failed for service web, unrecognized command.'
await 'Exit of general recover after release write lock'
await 'Functionalping failed for service web, unrecognized command.'
unwatch
was_restarted cron "$cron"
is "$web" "$(pid_of web)"
