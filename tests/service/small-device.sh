# shellcheck shell=bash
# A device with one package. Sourced.

# make_small_device TOP ROOT: gives `descriptor`, the path of its descriptor in the root, and `queue`,
# that of the work queue.
make_small_device() {
  local tree
  tree=$(mktemp -d)
  "$1/scripts/make-device-root" "$tree" "$2"
  rmdir "$tree"
  cp "$1"/examples/device/etc/* "$2/etc"
  # shellcheck disable=SC2034 # for the script that sources this
  queue=/var/packages/Velkor/etc/appindex.queue
  descriptor=/var/packages/Notes/target/ui/index.conf
  mkdir -p "$2${descriptor%/*}"
  echo '{"app": "Notes", "title": "Notes"}' >"$2$descriptor"
}
