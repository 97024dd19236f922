# Standard input, output and error are closed: they are opened on /dev/null, the log has every line
# once, and commands work as ever. (The clock's library would open files in their places.)
speed=real
start cron
become_tolkwd -i "$configuration" -l "$log" -g <&- >&- 2>&- &
daemon=$!
await 'General ping successful!'
await 'Functionalping result correct functional ping'
await 'General ping successful!'
for fd in 0 1 2; do is /dev/null "$(readlink "/proc/$daemon/fd/$fd")"; done
unwatch
is 1 "$(grep -c 'This is the entry of threadfunc' "$log")"
