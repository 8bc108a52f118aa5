#!/bin/sh
# compile.sh MSGFMT LINK OUT FILE...: compiles every FILE <domain>/<language>.po into OUT/<language>/LC_MESSAGES/<domain>.mo
# and makes LINK a relative link to OUT. Starts from an empty OUT, so that a removed catalogue does not linger.
set -eu
msgfmt=$1 link=$2 out=$3
shift 3
rm -rf "$out"
for po; do
    case $po in *.po) ;; *) continue ;; esac
    language=$(basename "$po" .po)
    domain=$(basename "$(dirname "$po")")
    mkdir -p "$out/$language/LC_MESSAGES"
    "$msgfmt" --check --output-file="$out/$language/LC_MESSAGES/$domain.mo" "$po"
done
ln -sfnr "$out" "$link"
