# nginx hangs, master and workers. Its own stop command would leave the workers behind, which hold the
# port; the configuration has one that kills them all.
start nginx
nginx=$(pid_of nginx)
cat >/run/check-nginx <<'CHECK'
#!/bin/bash
exec 3<>/dev/tcp/127.0.0.1/80
printf 'GET / HTTP/1.0\r\n\r\n' >&3
grep -q '^HTTP' <&3 && echo service: nginx answers
CHECK
chmod +x /run/check-nginx
watch
await 'Functionalping result correct functional ping'
# shellcheck disable=SC2046  # each child is a word
kill -STOP "$nginx" $(cat "/proc/$nginx/task/$nginx/children")
await 'has been successfully functional recovered.'
unwatch
was_restarted nginx "$nginx"
