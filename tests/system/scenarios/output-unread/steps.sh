# Standard output is a pipe that is full and that nobody reads: after a moment the daemon goes on
# without it. When it is read again, the lines come back, the first one whole.
start cron
mkfifo /run/pipe
exec 7<>/run/pipe # a reader that reads nothing yet
dd if=/dev/zero bs=4k count=16 of=/run/pipe 2>/dev/null
become_tolkwd -i "$configuration" -l "$log" -g >/run/pipe 2>"$errors" &
daemon=$!
await 'General ping successful!'
await 'General ping successful!'
dd bs=4k count=16 if=/run/pipe of=/dev/null 2>/dev/null # the filling
await 'General ping successful!'
await 'General ping successful!'
unwatch
exec 8</run/pipe 7<&-
read -r first <&8
grep -qxF -- "$first" "$log" || fail "not a line of the log: $first"
