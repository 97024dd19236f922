#!/usr/bin/env bash
# makesystem.sh FOLDER CODENAME MIRROR: makes the Debian system that the machines are copies of.
# It holds systemd and the init of System V; boot.sh starts one of them.
set -euo pipefail

readonly folder=$1 codename=$2 mirror=$3

# cron and memcached are the services that are watched; libfaketime lets the daemon's clock run.
readonly packages=cron,libfaketime,memcached,systemd,sysvinit-core

# dpkg waits for the disk at every file, so the work is done in memory, in a mount namespace that
# ends with this script.
if [ "${4-}" != --inside ]; then
    exec unshare --mount "$0" "$@" --inside
fi
work=$folder.work
mkdir -p "$work"
mount -t tmpfs tmpfs "$work"
trap 'cd / && umount --lazy "$work" && rmdir "$work"' EXIT
debootstrap --variant=minbase --include="$packages" "$codename" "$work/system" "$mirror"
cd "$work/system"

# No test needs these, and listing all files takes longer with them.
for unneeded in var/cache/apt var/lib/apt/lists usr/share/doc usr/share/locale usr/share/man; do
    find "$unneeded" -mindepth 1 -delete
done
# These would disturb a test that runs at their time of day.
rm -r etc/crontab etc/systemd/system/timers.target.wants

# Runlevel 2, without the scripts that set up hardware and file systems. /run/booted marks the end.
cat >etc/inittab <<'END'
id:2:initdefault:
si::sysinit:/usr/bin/touch /run/utmp
l2:2:wait:/etc/init.d/rc 2
up:2:once:/usr/bin/touch /run/booted
END

rm -rf "$folder.copy"
cp -a . "$folder.copy"
mv "$folder.copy" "$folder"
