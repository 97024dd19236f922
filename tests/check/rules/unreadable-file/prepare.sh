#!/bin/sh
# There is no such file.
[ "$1" = right ] || rm wrong.xml
