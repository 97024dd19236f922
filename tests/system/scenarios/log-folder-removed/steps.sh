# The log's folder goes while 200 threads log: it is moved away, or removed as a whole. The daemon
# ends with status 200 and says so once, every time.
everything_runs
speed=100
for number in $(seq 200); do one_target "service$number" 60; done | configure
folder=/run/logs
for round in $(seq "$(rounds 50)"); do
    mkdir "$folder"
    become_tolkwd -i "$configuration" -l "$folder/tolkwd.log" -g >/dev/null 2>"$errors" &
    daemon=$!
    until_true threads_log 200 "$folder/tolkwd.log"
    if [ $((round % 2)) -eq 0 ]; then
        mv "$folder" "$folder.gone"
    else
        # The daemon can make its file again between the removal of the file and of the folder.
        until rm -r "$folder" 2>/dev/null; do :; done
    fi
    ends_with 200
    is 'Unable to open the log file' "$(cat "$errors")"
    rm -rf "$folder.gone"
    say "round $round"
done
