#!/bin/sh
# Runs a command on a display of its own: a fresh Xvfb whose number the server
# picks itself (-displayfd), so that tests run side by side and never on the desktop.
set -u
fifo_dir=$(mktemp -d) || exit 1
mkfifo "$fifo_dir/fd" || exit 1
Xvfb -displayfd 3 -screen 0 1600x1200x24 -nolisten tcp -noreset 3>"$fifo_dir/fd" >/dev/null 2>&1 &
xvfb_pid=$!
read -r display_number <"$fifo_dir/fd"
rm -rf "$fifo_dir"
[ -n "${display_number:-}" ] || { echo "run-with-display: no Xvfb" >&2; kill "$xvfb_pid"; exit 1; }
# No accessibility bus here; DOCUVANE_PRIVATE_DISPLAY tells the tests they are on their own display.
export DISPLAY=":$display_number" DOCUVANE_PRIVATE_DISPLAY=1 NO_AT_BRIDGE=1
unset WAYLAND_DISPLAY
"$@"
status=$?
kill "$xvfb_pid" 2>/dev/null
wait "$xvfb_pid" 2>/dev/null
exit $status
