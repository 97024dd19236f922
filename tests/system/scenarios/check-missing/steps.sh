# The program of a check is missing. Where the shell says so in the words of bash, that is no fault of
# the service: nothing is recovered.
start cron
watch
await 'Functionalping failed for service cron, unrecognized command.'
await 'Functionalping failed for service cron, unrecognized command.'
unwatch
