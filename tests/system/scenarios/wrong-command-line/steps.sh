# Wrong calls end with status 2 and one line on standard error, and leave no log. On a fresh
# installation, a wrong call waits for the installer and sets the marker like any other.
refused() {
    local message=$1 status=0
    shift
    (become_tolkwd "$@") >/opt/results/stdout 2>"$errors" || status=$?
    is 2 "$status"
    is "$message" "$(cat "$errors")"
    [ ! -s /opt/results/stdout ] || fail 'it wrote to standard output'
    [ ! -e "$log" ] || fail 'it logged'
}
refused 'input configuration file path not specified'
refused 'output log file path not specified' -i "$configuration"
refused "'-i' used but no input file path specified " -i
refused "'-i' used but no input file path specified " -i -l "$log"
refused "'-o' used but no output local log file path specified " -i "$configuration" -l -t 120
refused "'-t' used but no check time specified " -i "$configuration" -l "$log" -t

rm "$installation/wd.nxinstalled"
echo 1 >/run/breminstall.pid
speed=40
become_tolkwd -i 2>"$errors" &
daemon=$!
pauses_twice
[ ! -s "$errors" ] || fail 'it complained before the installer was gone'
rm /run/breminstall.pid
ends_with 2
is "'-i' used but no input file path specified " "$(cat "$errors")"
[ -e "$installation/wd.nxinstalled" ] || fail 'it set no marker'
