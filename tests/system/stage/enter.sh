#!/usr/bin/env bash
# Runs inside the sandbox: sets up a machine on which the daemon and three services are installed
# and nothing runs, then plays the steps of the scenario.
set -euo pipefail
shopt -s inherit_errexit

# shellcheck source-path=SCRIPTDIR source=stage.sh
. "$(dirname "$0")/stage.sh"

# The machine's init scripts, in a folder of the sandbox's own.
cp -a /opt/machine/init.d/. /etc/init.d/
mkdir -p "$installation" "$ping_folder" /var/log/redis /var/log/nginx
chown redis:redis /var/log/redis /var/lib/redis
touch "$installation/cimom" "$installation/wd.nxinstalled"
[ ! -e /opt/scenario/tolkwd.xml ] || cp /opt/scenario/tolkwd.xml "$configuration"

# shellcheck source=/dev/null
. /opt/scenario/steps.sh
