# What whoever started the daemon had open (a lock, a socket) stays with the daemon: what it starts
# has standard input, output and error, and nothing else. (The clock's library has files of its own.)
speed=real
invent web
start web
exec 8>/run/a-lock 9</etc/passwd
watch
await 'Functionalping result correct functional ping'
for fd in 8 9; do [ -e "/proc/$daemon/fd/$fd" ] || fail "the daemon itself has lost descriptor $fd"; done
unwatch
