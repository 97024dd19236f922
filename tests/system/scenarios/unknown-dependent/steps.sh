# A dependent that the machine does not have (it was removed, or is misspelt) costs nothing but two
# commands that fail: the others are recovered all the same.
start redis-server nginx
redis=$(pid_of redis-server) nginx=$(pid_of nginx)
watch
await 'General ping successful!'
slay redis-server
await 'has been general recoverred successfully.'
unwatch
was_restarted redis-server "$redis"
was_restarted nginx "$nginx"
holds "$errors" 'removed-service: unrecognized service'
