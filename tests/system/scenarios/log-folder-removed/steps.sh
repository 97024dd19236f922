# The log's folder goes while 200 threads log. The daemon ends with status 200 and says so once,
# every time.
everything_runs
speed=100
for number in $(seq 200); do one_target "service$number" 60; done | configure
folder=/run/logs
for round in $(seq "$(rounds 50)"); do
    mkdir "$folder"
    become_tolkwd -i "$configuration" -l "$folder/tolkwd.log" -g >/dev/null 2>"$errors" &
    daemon=$!
    until_true threads_log 200 "$folder/tolkwd.log"
    mv "$folder" "$folder.gone"
    ends_with 200
    is 'Unable to open the log file' "$(cat "$errors")"
    rm -r "$folder.gone"
    say "round $round"
done
