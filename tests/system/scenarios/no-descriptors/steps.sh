# With descriptors for no more than a log line and a pipe at a time the daemon does all its work;
# with none left for the log it ends as it does whenever the log cannot be opened.
invent web
start web
web=$(pid_of web)
run_as=(prlimit --nofile=16)
watch
await 'Threshold is not reached'
await 'Functionalping result correct functional ping'
slay web
await 'has been general recoverred successfully.'
unwatch
was_restarted web "$web"

watch
await 'General ping successful!'
prlimit --pid "$daemon" --nofile=3:
ends_with 200
is 1 "$(grep -cx 'Unable to open the log file' "$errors")"
