# No process can be made for a while. A ping cannot run its command then: what the command printed
# the last time stands, and decides; without it the service counts as failing, and so does the
# recovery, which cannot run anything either. When processes can be made again, all is well again.
invent web db
start web db
as_nobody prlimit --nproc=1000
watch
await 'agent.web, result = web is running., state = 0'
await 'agent.db, result = db is running., state = 0'
limit_processes 0
await 'agent.db, result = db is running., state = 127'
rm "$ping_folder/agent.db"
await 'agent.web, result = web is running., state = 127'
await 'agent.db, result = , state = 127'
await 'Unable to fetch stats of process from system'
await 'Exit of general recover after release write lock'
limit_processes 1000
await 'General ping failed for service db, but this service has been general recoverred successfully.'
await 'agent.web, result = web is running., state = 0'
unwatch
