#!/usr/bin/env bash
# install.sh FOLDER: installs there what drives the browser, as package-lock.json has it; once.
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
mkdir -p "$1"
cd "$1"
if cmp -s "$here/package-lock.json" installed; then
    exit 0
fi
rm -f installed
cp "$here/package.json" "$here/package-lock.json" .
npm ci --ignore-scripts --prefer-offline --no-audit --no-fund
cp package-lock.json installed
