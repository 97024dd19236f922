# redis-server, nginx and cron are killed in the same second, while a fourth service, which is asked
# all the time, is well; a fifth depends on nginx. Each is recovered; no recovery overlaps another,
# and nothing is asked meanwhile.
invent neighbour dependent
start redis-server nginx cron neighbour dependent
redis=$(pid_of redis-server) nginx=$(pid_of nginx) cron=$(pid_of cron)
dependent=$(pid_of dependent)
watch
for service in redis-server nginx cron neighbour; do
    until_true grep -qF "agent.$service, result = $service is running." "$log"
done
slay redis-server nginx cron
for count in 1 2 3; do
    await 'but this service has been general recoverred successfully.'
    say "recovered: $count"
done
unwatch
was_restarted redis-server "$redis"
was_restarted nginx "$nginx"
was_restarted cron "$cron"
was_restarted dependent "$dependent"
# The run has shown something only if the neighbour was asked while the others were down.
asked=$(grep -c 'begin .* service neighbour status' /opt/results/journal)
[ "$asked" -gt 10 ] || fail "the neighbour was asked only $asked times"
