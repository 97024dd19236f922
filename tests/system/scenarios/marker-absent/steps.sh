# The first start after an installation, without an installer: the marker is set at once, and the
# second start does not set it again.
start cron
rm "$installation/wd.nxinstalled"
watch
await 'General ping successful!'
[ -e "$installation/wd.nxinstalled" ] || fail 'it set no marker'
unwatch
watch
await 'General ping successful!'
unwatch
