#!/usr/bin/env bash
# secrets_bus.sh PROGRAM...: runs a test program on a session bus of its own, with an unlocked keyring in an empty home.
set -eu
if [ -z "${SECRETS_HOME:-}" ]; then
    SECRETS_HOME=$(mktemp -d)
    export SECRETS_HOME
    trap 'rm -rf "$SECRETS_HOME"' EXIT
    export HOME=$SECRETS_HOME XDG_RUNTIME_DIR=$SECRETS_HOME XDG_DATA_HOME=$SECRETS_HOME/data
    unset DISPLAY WAYLAND_DISPLAY
    dbus-run-session -- "$0" "$@"
    exit
fi
mkfifo "$SECRETS_HOME/password"
gnome-keyring-daemon --foreground --unlock --components=secrets <"$SECRETS_HOME/password" >/dev/null 2>&1 &
export KEYRING_PID=$!
printf 'a password' >"$SECRETS_HOME/password"
gdbus wait --session --timeout 10 org.freedesktop.secrets
result=0
"$@" || result=$?
kill -KILL "$KEYRING_PID"
exit $result
