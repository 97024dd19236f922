# The file system of the log is full: the daemon watches on, and logs on when there is room again.
start cron
mkdir /run/small
mount -t tmpfs -o size=256k tmpfs /run/small
become_tolkwd -i "$configuration" -l /run/small/tolkwd.log -g >/opt/results/stdout 2>"$errors" &
daemon=$!
until_true grep -qs 'General ping successful!' /run/small/tolkwd.log
dd if=/dev/zero of=/run/small/filling bs=1k 2>/dev/null || true
size=$(stat -c %s /run/small/tolkwd.log)
said=$(grep -c 'General ping successful!' /opt/results/stdout)
until_true more_than "$said" 'General ping successful!' /opt/results/stdout
until_true more_than "$((said + 3))" 'General ping successful!' /opt/results/stdout
stop cron # an outage that no log has room for
until_true more_than 0 'has been general recoverred successfully.' /opt/results/stdout
up cron || fail 'cron was not recovered'
# Less than a page can still have gone into the last page that the log had.
[ "$(stat -c %s /run/small/tolkwd.log)" -lt "$((size + 4096))" ] || fail 'the disk was not full'
rm /run/small/filling
logged=$(grep -c 'General ping successful!' /run/small/tolkwd.log)
until_true more_than "$logged" 'General ping successful!' /run/small/tolkwd.log
unwatch
grep -F '|TID' /opt/results/stdout >"$log" # every line of the daemon, whole
[ ! -s "$errors" ] || fail 'it complained'
