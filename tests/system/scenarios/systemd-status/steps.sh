# What `service NAME status` prints on a systemd host: the unit's name and description first. No
# keyword stands in that line, so the exit status decides: 0 for active, 3 for inactive.
invent_unit() {
    cat >"/etc/init.d/$1" <<'INIT'
#!/bin/sh
name=${0##*/}
case $1 in
    start) echo active >"/run/$name.unit" ;;
    stop) rm -f "/run/$name.unit" ;;
    status)
        if [ -e "/run/$name.unit" ]; then
            printf '\342\227\217 %s.service - Advanced key-value store\n' "$name"
            printf '     Loaded: loaded (/lib/systemd/system/%s.service; enabled)\n' "$name"
            printf '     Active: active (running) since Sat 2026-11-21 09:00:00 UTC; 2h ago\n'
        else
            printf '\342\227\213 %s.service - Advanced key-value store\n' "$name"
            printf '     Active: inactive (dead)\n'
            exit 3
        fi
        ;;
esac
INIT
    chmod +x "/etc/init.d/$1"
}
invent_unit store
service store start
watch
await 'General ping successful! state = 0'
service store stop
await 'has been general recoverred successfully.'
unwatch
[ -e /run/store.unit ] || fail 'the unit was not started'
