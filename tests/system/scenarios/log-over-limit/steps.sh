# 200 threads log past the limit of the file: it is emptied, and every line in it is whole.
everything_runs
speed=100
for number in $(seq 200); do one_target "service$number" 10; done | configure
head -c 1023000 <(yes 'an old line') >"$log"
watch
first='an old line'
emptied() {
    local now
    now=$(head -n 1 "$log")
    [ -n "$now" ] && [ "$now" != "$first" ] && first=$now
}
for count in 1 2 3; do
    until_true emptied
    say "emptied: $count"
done
unwatch
line='^[A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9][0-9] ([0-9]{2}:){2}[0-9]{2} [0-9]{4} (ERROR|INFO|DEBUG) wd[a-z]+ ?\|TID[0-9]+ '
# The very last line can be one that the end of the daemon cut short.
torn=$(head -n -1 "$log" | grep -vE "$line" || true)
is '' "$torn"
[ "$(stat -c %s "$log")" -le 1100000 ] || fail 'the log was not emptied'
