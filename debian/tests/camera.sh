# shellcheck shell=bash
# A simulated camera for the tests; the file is read by them.
set -euo pipefail

work=${AUTOPKGTEST_TMP:-$(mktemp -d)}
camera_pid=''

stop_camera() {
  if [ -n "$camera_pid" ]; then kill "$camera_pid" 2>/dev/null || true; fi
}

# Leaves the port in `port`.
start_camera() {
  local try
  trap stop_camera EXIT
  twcamsim --endpoint json --for 5m >"$work/camera.json" &
  camera_pid=$!
  for ((try = 0; try < 300; try++)); do
    port=$(grep -o '"port":[0-9]*' "$work/camera.json" | cut -d: -f2) || true
    if [ -n "$port" ]; then return; fi
    sleep 0.1
  done
  echo 'the camera does not start' >&2
  return 1
}

# asks PROGRAM: it prints what the camera answers
asks() {
  "$1" 127.0.0.1 "$port" /info.json | tee "$work/answer"
  grep -q '"success":true' "$work/answer"
}
