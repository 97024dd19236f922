# A check prints 500 MB in one line. The daemon reads the first MiB of it and stays small, whether it
# logs the answer (-g) or not.
start cron
kilobytes() { sed -n "s/^$1:[\t ]*\([0-9]*\) kB/\1/p" "/proc/$daemon/status"; }
begun() { [ "$(wc -l </run/begun)" -ge "$1" ]; }

for option in -g ''; do
    rm -f /run/go
    : >/run/begun
    # shellcheck disable=SC2086  # no option is no word
    become_tolkwd -i "$configuration" -l "$log" $option >/dev/null 2>>"$errors" &
    daemon=$!
    until_true begun 1
    idle=$(kilobytes VmRSS)
    touch /run/go
    until_true begun 2 # a retry: the first answer has been rated and logged
    grown=$(($(kilobytes VmHWM) - idle))
    say "$grown kB more than before the check"
    [ "$grown" -le 8192 ] || fail "the answer took $grown kB"
    unwatch
done
