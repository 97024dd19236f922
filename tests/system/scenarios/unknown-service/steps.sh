# A target whose service the machine does not have ends its own thread; the others go on.
start cron
watch
await 'General ping failed for service removed-service, unrecognized service.'
await 'General ping successful!'
await 'General ping successful!'
unwatch
is 1 "$(grep -c 'begin .* service removed-service status' /opt/results/journal)"
