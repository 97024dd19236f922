# Between refreshes targets are added, reordered, renamed and removed; each generation watches
# exactly what the file says, in its order.
speed=40
refresh=120
invent web db app
start web db app
targets web
watch
await 'Name of the service being monitored: web'
targets web db
await 'join threadas*'
await 'thread is joined...'
await 'after join......'
await 'Name of the service being monitored: db'
targets db web
await 'join threadas*'
await '******************************:db'
await '******************************:web'
await 'Name of the service being monitored:'
await 'Name of the service being monitored:'
targets db app # web is renamed
await 'join threadas*'
await '******************************:db'
await '******************************:app'
await 'Name of the service being monitored: app'
targets app
await 'join threadas*'
await '******************************:app'
await 'Name of the service being monitored: app'
configure </dev/null
await 'join threadas*'
await 'after join......'
await 'join threadas*' # a generation without targets
targets web
await 'Name of the service being monitored: web'
await 'General ping successful!'
unwatch
is 'web web db db web db app app web' "$(sed -n 's/.*Name of the service being monitored: //p' "$log" | xargs)"
