#!/bin/sh
# Runs one command on a display of its own: a fresh Xvfb server whose number
# the server picks itself (-displayfd), so that tests can run side by side.
# An existing DISPLAY is ignored on purpose: tests must not touch the desktop.
set -u
fifo_dir=$(mktemp -d) || exit 1
mkfifo "$fifo_dir/fd" || exit 1
Xvfb -displayfd 3 -screen 0 1600x1200x24 -nolisten tcp -noreset 3>"$fifo_dir/fd" >/dev/null 2>&1 &
xvfb_pid=$!
read -r display_number <"$fifo_dir/fd"
rm -rf "$fifo_dir"
if [ -z "${display_number:-}" ]; then
  echo "run-with-display: Xvfb did not start" >&2
  kill "$xvfb_pid" 2>/dev/null
  exit 1
fi
DISPLAY=":$display_number"
# Tells test programs that they already run on a display of their own.
DOCUVANE_PRIVATE_DISPLAY=1
export DOCUVANE_PRIVATE_DISPLAY
export DISPLAY
unset WAYLAND_DISPLAY
# No accessibility bus: nothing listens on it here, and GTK would try to reach it.
NO_AT_BRIDGE=1
export NO_AT_BRIDGE
"$@"
status=$?
kill "$xvfb_pid" 2>/dev/null
wait "$xvfb_pid" 2>/dev/null
exit $status
