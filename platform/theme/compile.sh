#!/bin/sh
# compile.sh EDJE_CC OUTPUT ARGUMENT...: compiles a theme file. edje_cc leaves it readable for its maker alone, and whoever
# else starts the program would see an empty window.
set -eu
edje_cc=$1 output=$2
shift 2
"$edje_cc" "$@" "$output"
chmod 644 "$output"
