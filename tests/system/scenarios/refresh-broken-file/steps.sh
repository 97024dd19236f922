# The configuration is replaced by garbage, by nothing, by one with an empty tag, and removed. None
# ends the daemon; it watches nothing meanwhile, asks again at each refresh, and goes on when a good
# file is back.
speed=40
refresh=120
invent web
start web
targets web
cp "$configuration" /run/good.xml
watch
await 'General ping successful!'

broken() {
    say "$1"
    await 'join threadas*' # it has met the good file: its threads end
    await 'after join......'
    await 'join threadas*' # and the broken one
    cp /run/good.xml "$configuration"
    await 'Name of the service being monitored: web'
    await 'General ping successful!'
}

: >"$configuration"
broken 'an empty file'
gzip -c /run/good.xml >"$configuration"
broken garbage
lacks "$log" 'Loadservices error.'
sed 's|<stopcmd>NULL</stopcmd>|<stopcmd/>|' /run/good.xml >"$configuration"
broken 'an empty tag'
grep -q 'ERROR wdmanager.* Loadservices error.$' "$log" || fail 'the load did not fail'
lacks "$errors" 'unable to open'
rm "$configuration"
broken 'no file'
holds "$errors" 'error, unable to open the input file: 0'
unwatch
