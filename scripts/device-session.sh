# shellcheck shell=bash
# A fresh device root with its system log and its search daemon, for as long as a script runs. Sourced,
# after background.sh.

# begin_device TOP BUILD_DIR DEVICE_TREE: makes the device and starts its programs; gives `root`, its
# directory.
begin_device() {
  device_work=$(mktemp -d "${TMPDIR:-/tmp}/teiseigatro.XXXXXX")
  trap end_device EXIT
  root=$device_work/root
  "$1/scripts/make-device-root" "$3" "$root"
  "$2/examples/programs/device_log" --root "$root" >"$root/var/messages" &
  background_pids+=($!)
  start_daemon "$2" "$root"
}

end_device() {
  stop_background
  rm -rf "$device_work"
}
