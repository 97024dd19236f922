#!/usr/bin/env bash
# boot.sh SYSTEM KIND: boots a copy of this system in namespaces of its own, with the init of KIND
# (systemd or sysv) as process 1. Prints the process id of that init and keeps the machine until
# standard input ends. Whatever the machine writes is in memory only.
set -euo pipefail

# Runs in the new namespaces and becomes their process 1. Nothing outside sees these mounts.
become_machine() {
    local pid device
    read -r pid _ </proc/self/stat # as seen from outside: this is still the outer /proc
    cd "$1"
    ip link set lo up
    mount -t tmpfs tmpfs /run
    mkdir /run/upper /run/work /run/root
    mount -t overlay -o lowerdir=.,upperdir=/run/upper,workdir=/run/work overlay /run/root
    cd /run/root

    mount -t proc proc proc
    mount --bind -o ro proc/sys proc/sys
    mount -t sysfs -o ro sysfs sys
    mount -t cgroup2 cgroup2 sys/fs/cgroup
    mount -t tmpfs -o mode=755 tmpfs run
    mount -t tmpfs tmpfs tmp
    mount -t tmpfs -o mode=755 tmpfs dev
    for device in null zero full random urandom tty; do
        touch "dev/$device"
        mount --bind "/dev/$device" "dev/$device"
    done
    mkdir dev/pts dev/shm
    mount -t devpts -o newinstance,ptmxmode=666,mode=620,gid=5 devpts dev/pts
    mount -t tmpfs tmpfs dev/shm
    ln -s pts/ptmx dev/ptmx
    ln -s /proc/self/fd dev/fd
    ln -s fd/0 dev/stdin
    ln -s fd/1 dev/stdout
    ln -s fd/2 dev/stderr

    local init=(/lib/systemd/systemd --unit=multi-user.target)
    if [ "$2" = sysv ]; then
        init=(/sbin/init)
        rm bin/systemctl # a machine of this kind does not have systemd's package
    fi
    pivot_root . mnt
    cd /
    umount --lazy /mnt
    echo "$pid"
    exec setpriv --bounding-set=-sys_module,-sys_time,-syslog,-sys_rawio \
        env --ignore-environment container=test \
        PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin \
        "${init[@]}" </dev/null >/dev/null 2>&1
}

if [ "$1" = --inside ]; then
    become_machine "$2" "$3"
fi

groups=$(findmnt --noheadings --first-only --types cgroup2 --output TARGET)
group=$(mktemp --directory "$groups/tolkwd.XXXXXX")
(
    echo "$BASHPID" >"$group/cgroup.procs"
    exec unshare --cgroup --pid --mount --net --uts --ipc --kill-child "$0" --inside "$@"
) &
exec >&- # so that the reader sees the end if the machine fails to start
disown # so that bash does not report the kill
read -r _ || true
kill -KILL $! 2>/dev/null || true
while grep -q '^populated 1' "$group/cgroup.events"; do sleep 0.02; done
find "$group" -depth -type d -exec rmdir {} +
