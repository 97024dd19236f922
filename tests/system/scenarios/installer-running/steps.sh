# A fresh installation, and the installer still runs: nothing is logged, nothing is asked, no marker
# is set until its pid file is gone.
start cron
rm "$installation/wd.nxinstalled"
echo 1 >/run/breminstall.pid
speed=40
watch
pauses_twice
[ ! -e "$log" ] || fail 'it logged'
[ ! -e "$installation/wd.nxinstalled" ] || fail 'it set the marker'
rm /run/breminstall.pid
await 'General ping successful!'
[ -e "$installation/wd.nxinstalled" ] || fail 'it set no marker'
unwatch
