#!/bin/sh
[ "$1" = right ] || rmdir /opt/varden/tolk/bin
