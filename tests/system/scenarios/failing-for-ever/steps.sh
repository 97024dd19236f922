# nginx is stopped and its configuration is broken: no start helps. After two recoveries it is given
# up. Somebody mends the configuration; the next refresh, and no earlier event, brings nginx back.
speed=40
refresh=1800
start nginx
watch
await 'General ping successful!'
stop nginx
mkdir /run/nginx-broken
mount --bind /run/nginx-broken /var/log/nginx && mount -o remount,bind,ro /var/log/nginx
await 'Failed to general recover the sevice nginx after try the max times.'
umount /var/log/nginx
await 'After globalrefresh times refreshconfig,join threadas*'
! up nginx || fail 'nginx runs again before the refresh'
await 'has been general recoverred successfully.'
unwatch
up nginx || fail 'nginx does not run'
