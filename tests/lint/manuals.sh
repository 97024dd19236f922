#!/usr/bin/env bash
# manuals.sh PAGE...: fails when mandoc or man has something to say about a manual page. Which other
# pages are installed here, and known to mandoc's database, is this machine's matter.
set -euo pipefail

remarks=$(
    mandoc -T lint "$@" 2>&1 | grep -vE 'referenced manual not found|outdated mandoc.db' || true
    for page; do
        LC_ALL=C.UTF-8 man --warnings --local-file "$page" 2>&1 >/dev/null || echo "man: $page"
    done
)
[ -z "$remarks" ] || printf '%s\n' "$remarks"
[ -z "$remarks" ]
