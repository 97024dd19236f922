# The marker cannot be set (a read-only file system): said once on standard error, and the daemon
# runs all the same. The next start tries again.
start cron
rm "$installation/wd.nxinstalled"
mount --bind "$installation" "$installation"
mount -o remount,bind,ro "$installation"
for count in 1 2; do
    watch
    await 'General ping successful!'
    unwatch
    is "$count" "$(grep -c "^touch: .*wd.nxinstalled" "$errors")"
done
