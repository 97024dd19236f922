# Fifty monitors live through many refreshes: some only ping, some check and read figures, some give
# up at once and end through another door. The daemon is afterwards what it was after the first ten
# generations: as large, with as many descriptors and threads.
speed=400
refresh=120
everything_runs
for number in $(seq 50); do
    case $number in
        *5) one_target "service$number" 60 3 'echo service: fine' 2 ;;
        *0) one_target "service$number" 60 0 ;;
        *) one_target "service$number" 60 ;;
    esac
done | configure
mkfifo /run/lines
python3 /opt/stage/figures.py "$REFRESHES" /opt/results/figures </run/lines &
figures=$!
become_tolkwd -i "$configuration" -l "$log" -t "$refresh" -g >/run/lines 2>"$errors" &
daemon=$!
wait "$figures" || fail "see above"
unwatch
