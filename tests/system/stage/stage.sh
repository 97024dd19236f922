# What the steps of a scenario are made of. Sourced before them, inside the sandbox.
# shellcheck shell=bash
# shellcheck disable=SC2034  # what is not used here is for the steps

readonly log=/opt/results/tolkwd.log
readonly errors=/opt/results/stderr
readonly configuration=/run/tolkwd.xml
readonly installation=/etc/opt/varden/tolk
readonly ping_folder=/opt/varden/tolk/bin
readonly tolkwd=/opt/tolkwd/tolkwd

speed=20          # how many of the daemon's seconds pass in one second; "real": the clock is left
                  # alone; "file": it is as the file of FAKETIME_TIMESTAMP_FILE says
refresh=10800     # its refresh period, in its own seconds
patience=${PATIENCE:-120} # how long `await` and `until_true` wait, in seconds
daemon=           # process id of the daemon
cursor=0          # lines of the log that `await` has passed

say() { printf '== %s\n' "$*"; }

fail() {
    printf 'FAILED: %s\n' "$*"
    exit 1
}

clock=(/usr/lib/*/faketime/libfaketimeMT.so.1)
commands=/opt/stage/bin # where the daemon finds the commands that are written down
run_as=()               # a command line that runs another as somebody else

# Turns the shell, which should be one in parentheses or in the background, into the daemon with
# these arguments. Its commands are written down, and its clock runs faster than theirs.
become_tolkwd() {
    local environment=(PATH="$commands:$PATH" FAKETIME_ONLY_CMDS=tolkwd)
    case $speed in
        real) ;;
        file) environment+=(LD_PRELOAD="${clock[0]}") ;;
        *) environment+=(LD_PRELOAD="${clock[0]}" FAKETIME="+0 x$speed") ;;
    esac
    # shellcheck disable=SC2086  # a command line: the wrapper's words are separate ones
    exec "${run_as[@]}" env "${environment[@]}" ${TOLKWD_WRAPPER-} "$tolkwd" "$@"
}

# Starts the daemon on the configuration in the background; its standard output and standard error
# are kept as /opt/results/stdout and stderr. Only its own lines are awaited from now on.
watch() {
    [ ! -e "$log" ] || cursor=$(wc -l <"$log")
    become_tolkwd -i "$configuration" -l "$log" -t "$refresh" -g "$@" \
        >>/opt/results/stdout 2>>"$errors" &
    daemon=$!
}

# until_true COMMAND...: waits until the command succeeds.
until_true() {
    local deadline=$((SECONDS + patience))
    until "$@"; do
        [ "$SECONDS" -lt "$deadline" ] || fail "still not true after $patience s: $*"
        sleep 0.05
    done
}

# line_with TEXT: the number of the next line of the log, behind the one awaited last, that holds it.
line_with() {
    [ ! -e "$log" ] || TEXT=$1 awk -v cursor="$cursor" \
        'NR > cursor && index($0, ENVIRON["TEXT"]) { print NR; exit }' "$log"
}

# await TEXT: waits for the next line of the log, behind the one awaited last, that holds TEXT.
await() {
    local deadline=$((SECONDS + patience)) found
    until found=$(line_with "$1") && [ -n "$found" ]; do
        [ "$SECONDS" -lt "$deadline" ] || fail "not in the log after $patience s: $1"
        runs || fail "the daemon has ended before it logged: $1"
        sleep 0.05
    done
    cursor=$found
}

# Whether the daemon runs.
runs() { kill -0 "$daemon" 2>/dev/null; }

# Waits until the daemon, which should do nothing but pause, has paused twice more.
pauses_twice() {
    local before
    until_true grep -qE '^(tolkwd|memcheck.*)$' "/proc/$daemon/comm"
    until_true grep -q '^State:.S' "/proc/$daemon/status"
    before=$(pauses)
    until_true paused_since $((before + 2))
    runs || fail 'the daemon did not wait'
}
pauses() { sed -n 's/^voluntary_ctxt_switches:\t//p' "/proc/$daemon/status"; }
paused_since() { [ "$(pauses)" -ge "$1" ]; }

# Ends the daemon.
unwatch() {
    [ ! -e "$log" ] || cursor=$(wc -l <"$log")
    runs || fail "the daemon has ended by itself"
    kill -KILL "$daemon"
    wait "$daemon" 2>/dev/null || true
}

# ends_with STATUS: waits until the daemon has ended by itself, which it must with this exit status.
ends_with() {
    local deadline=$((SECONDS + patience)) status=0
    while runs; do
        [ "$SECONDS" -lt "$deadline" ] || fail "the daemon has not ended after $patience s"
        sleep 0.02
    done
    wait "$daemon" || status=$?
    [ "$status" -eq "$1" ] || fail "the daemon ended with status $status, not $1"
}

# more_than COUNT TEXT FILE: whether more than so many lines hold the text.
more_than() { [ "$(grep -cF -- "$2" "$3")" -gt "$1" ]; }

# threads_log COUNT FILE: whether so many threads have begun to log there.
threads_log() { [ "$(grep -so '|TID[0-9]*' "$2" | sort -u | wc -l)" -ge "$1" ]; }

# is EXPECTED ACTUAL: two texts that should be one.
is() {
    [ "$1" = "$2" ] || fail "expected: $1
     but got: $2"
}

# holds FILE TEXT, lacks FILE TEXT
holds() { grep -qF -- "$2" "$1" || fail "$1 does not hold: $2"; }
lacks() { ! grep -qF -- "$2" "$1" || fail "$1 holds: $2"; }

# start SERVICE..., stop SERVICE...: as an operator does it.
start() {
    local service
    for service; do
        service "$service" start >/dev/null || fail "cannot start $service"
        until_true settled "$service"
    done
}
stop() {
    local service
    for service; do
        service "$service" stop >/dev/null || fail "cannot stop $service"
    done
}

# slay SERVICE...: kills its process, and the children of it, which may outlive it.
slay() {
    local service pid
    for service; do
        pid=$(pid_of "$service")
        # shellcheck disable=SC2046  # each child is a word
        kill -KILL "$pid" $(cat "/proc/$pid/task/$pid/children")
    done
}

# Whether the process that its pid file names is the one that stays: cron becomes another process
# after it has written the file.
settled() {
    up "$1" || return
    [ "$1" != cron ] || [ "$(pidof cron)" = "$(pid_of cron)" ]
}

# pid_of SERVICE: the process id of a service.
pid_of() {
    case $1 in
        redis-server) cat /run/redis/redis-server.pid ;;
        nginx) cat /run/nginx.pid ;;
        cron) cat /run/crond.pid ;;
        php8.2-fpm) cat /run/php/php8.2-fpm.pid ;;
        *) cat "/run/$1.pid" ;;
    esac
}

# up SERVICE: whether it runs and says so.
up() { service "$1" status 2>&1 | grep -q 'is running'; }

# was_restarted SERVICE OLDPID: it runs as another process.
was_restarted() {
    up "$1" || fail "$1 does not run"
    [ "$(pid_of "$1")" != "$2" ] || fail "$1 still runs as process $2"
}

# invent SERVICE...: services of our own, with init scripts as Debian's are.
invent() { for service; do cp /opt/stage/invented-service "/etc/init.d/$service"; done; }

# Makes the service command succeed at once and print nothing, which means that everything runs: for
# tests with so many monitors that real ones would be a test of the machine.
everything_runs() {
    commands=/run/fast
    mkdir "$commands"
    ln -s /bin/true "$commands/service"
}

# Lets the daemon run as nobody, who has limits: root has none on processes and threads.
as_nobody() {
    chmod 755 "${tolkwd%/*}"
    chown nobody "$ping_folder" /opt/results
    chmod 1777 /tmp
    run_as=(setpriv --reuid nobody --clear-groups "$@")
}

# Sets the daemon's limit on the processes and threads of nobody.
limit_processes() { "${run_as[@]}" prlimit --pid "$daemon" --nproc="$1:"; }

# one_target NAME [INTERVAL [RECOVERIES [CHECK [SKIPS]]]]: the configuration of one target without
# dependents, for lists that are made by a loop.
one_target() {
    cat <<XML
  <wdmonitortarget>
    <wdmonitorservice>
      <name>$1</name>
      <binarypath>/usr/sbin/$1</binarypath>
      <startcmd>NULL</startcmd>
      <stopcmd>NULL</stopcmd>
      <functionalpingcmd>${4-NULL}</functionalpingcmd>
      <genpinginterval>${2-10}</genpinginterval>
      <funpinginterval>10</funpinginterval>
      <maxattemptofwakeup>${3-3}</maxattemptofwakeup>
      <MaxFPSkips>${5-0}</MaxFPSkips>
    </wdmonitorservice>
  </wdmonitortarget>
XML
}

# configure: makes a configuration of the targets on standard input, in one step as an editor does.
configure() {
    { echo '<wdtargets>'; cat; echo '</wdtargets>'; } >"$configuration.new"
    mv "$configuration.new" "$configuration"
}

# targets NAME...: the same of one_target for each name.
targets() { for name; do one_target "$name"; done | configure; }

# rounds COUNT: COUNT, or a tenth of it in a shortened run.
rounds() { if [ -n "${SHORT-}" ]; then echo $((($1 + 9) / 10)); else echo "$1"; fi; }
