#!/bin/sh
# enter.sh OPTION...: inside the sandbox, becomes the daemon with these further options. Its two
# outputs are one, as in the journal.
set -eu

exec /opt/become.sh "$@" 2>&1
