# Between refreshes targets are added, reordered, renamed and removed; each generation watches
# exactly what the file says, in its order, and the threads of the one before end within one ping.
speed=30
refresh=120
invent web db app
start web db app
targets web
watch

# next_is NAME...: writes the configuration, and waits until a generation has been listed with it.
next_is() {
    local name
    targets "$@"
    await 'join threadas*'
    for name; do await "******************************:$name"; done
}
await 'General ping successful!'
next_is web db
next_is db web
next_is db app # web is renamed
next_is app
next_is
await 'join threadas*' # the end of the generation without targets
next_is web
await 'General ping successful!'
unwatch

# What each generation was told to watch, in the order of the file. One can have come twice.
listed=$(awk -F '[*]:' '/join threadas/ { print names; names = "" } index($0, "******:") { names = names " " $NF }
    END { print names }' "$log" | uniq)
is "$(printf '%s\n' ' web' ' web db' ' db web' ' db app' ' app' '' ' web')" "$listed"

# What each generation did watch: the same.
of_generations() { awk -F "$1" -v text="$2" '/join threadas/ { n++ }
    index($0, text) { print n + 0, $NF }' "$log" | sort; }
is "$(of_generations '[*]:' '******************************:')" \
    "$(of_generations 'monitored: ' 'Name of the service being monitored: ')"

# A thread that is told to end pings once more at the most.
late=$(awk '/join threadas/ { ending = 1 } /after join|entry of threadfunc/ { ending = 0 }
    ending && /enter of general ping/ { if (++pings[$7] > 1) print }
    !ending { split("", pings) }' "$log")
is '' "$late"
