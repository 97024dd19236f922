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

# broken WHAT: the file is what it is; waits until a generation has lived on it, and mends it.
broken() {
    local loaded
    say "$1"
    await 'join threadas*' # the threads that the good file had end, and this one is read
    await 'after join......'
    loaded=$cursor
    await 'join threadas*'
    ! sed -n "$loaded,${cursor}p" "$log" | grep -q 'Name of the service being monitored' ||
        fail 'it watched something'
    cp /run/good.xml /run/new.xml
    mv /run/new.xml "$configuration"
    await 'Name of the service being monitored: web'
    await 'General ping successful!'
}
# becomes: the configuration becomes standard input, in one step.
becomes() {
    cat >/run/new.xml
    mv /run/new.xml "$configuration"
}

becomes </dev/null
broken 'an empty file'
gzip -c /run/good.xml | becomes
broken garbage
lacks "$log" 'Loadservices error.'
sed 's|<stopcmd>NULL</stopcmd>|<stopcmd/>|' /run/good.xml | becomes
broken 'an empty tag'
grep -q 'ERROR wdmanager.* Loadservices error.$' "$log" || fail 'the load did not fail'
lacks "$errors" 'unable to open'
rm "$configuration"
broken 'no file'
holds "$errors" 'error, unable to open the input file: 0'
unwatch
