#!/bin/sh
# The WebDAV conformance suites against a velora-cloud of its own. Fails when a test of any suite fails or is skipped.
set -u
work=$(mktemp -d)
echo secret | "$VELORA_CLOUD" --root "$work/root" --add-account litmus@example.org --listen 127.0.0.1:0 >"$work/out" &
server=$! # the last of the pipe
trap 'kill $server 2>/dev/null; rm -rf "$work"' EXIT
tries=0
until grep -q '^listening on ' "$work/out"; do
    tries=$((tries + 1))
    [ $tries -lt 100 ] || exit 1
    sleep 0.1
done
url=$(sed -n 's/^listening on //p' "$work/out")
cd "$work" || exit 1
TESTS='basic copymove props locks http' litmus --keep-going "${url}dav/" litmus@example.org secret >"$work/log" 2>&1
result=$?
tr '\r' '\n' <"$work/log"
kill $server
wait $server || exit 1
[ $result -eq 0 ] && ! grep -q -e FAIL -e SKIPPED "$work/log" && [ "$(grep -c ' 0 failed' "$work/log")" -eq 5 ]
