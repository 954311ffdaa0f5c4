# shellcheck shell=bash
# Programs in the background of a script, ended with it. Sourced.

background_pids=()

stop_background() {
  local pid
  for pid in "${background_pids[@]}"; do kill "$pid" 2>/dev/null || true; done
  for pid in "${background_pids[@]}"; do wait "$pid" 2>/dev/null || true; done
  background_pids=()
}

# start_daemon BUILD_DIR ROOT: starts the search daemon in a device root; returns when it listens.
start_daemon() {
  local ready
  exec {ready}< <(
    exec "$1/host/searchd/tovoelasticd" --root "$2" --foreground --ready-fd 1 \
      2>"$2/var/tovoelasticd.stderr"
  )
  background_pids+=($!)
  if ! read -r -u "$ready" _; then
    echo "the search daemon did not start:" >&2
    cat "$2/var/tovoelasticd.stderr" >&2
    return 1
  fi
  exec {ready}<&-
}
