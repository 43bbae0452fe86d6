# shellcheck shell=bash
# What the examples have in common: a simulated handset in a folder of its own, and runs of the program on it, each
# in a world as the step of the procedure needs it.
#
# An example sources this file first, with its own arguments:
#
#   EXAMPLE [BUILD]          with the embedded hub; BUILD is the build folder (build/dev)
#   EXAMPLE --hub [BUILD]    with vantle-hub, in real time
#
# With the embedded hub every run has a world of its own; vantle-hub is started anew for each step, with the same
# handset folder, as if somebody had moved the handset.

use_hub=false
if [[ ${1:-} == --hub ]]; then
  use_hub=true
  shift
fi
build=${1:-build/dev}
vantle=$build/src/main/vantle
hub=$build/tools/vantle-hub
folder=$(mktemp -d)
hub_pid=

cleanup() {
  if [[ -n $hub_pid ]]; then kill "$hub_pid" 2> /dev/null || true; fi
  rm -rf "$folder"
}
trap cleanup EXIT

start_hub() { # handset, KEY=VALUE...
  local handset=$1 key
  shift
  local -a flags=()
  for key in "$@"; do flags+=(--set "$key"); done
  rm -f "$folder/hub"
  VANTLE_ROOT=$folder/root "$hub" --socket "$folder/hub" --scenario "$handset" "${flags[@]}" > /dev/null 2>&1 &
  hub_pid=$!
  until [[ -S $folder/hub ]]; do
    kill -0 "$hub_pid" || return 1 # said so, where errors do not end the script
    sleep 0.05
  done
}

stop_hub() {
  kill "$hub_pid"
  wait "$hub_pid" || true
  hub_pid=
}

seed=0
in_world() { # handset, "KEY=VALUE ...", the program's words
  local handset=$1 settings=$2 status=0
  shift 2
  seed=$((seed + 1))
  settings+=" hub.seed=$seed" # noise of its own in each step
  mkdir -p "$folder/root"
  if $use_hub; then
    # shellcheck disable=SC2086
    start_hub "$handset" $settings || return 1
    VANTLE_HUB=unix:$folder/hub VANTLE_ROOT=$folder/root "$vantle" -v 1 -q "$@" || status=$?
    stop_hub
  else
    VANTLE_HUB="sim:$handset?$(tr ' ' '&' <<< "$settings")" VANTLE_ROOT=$folder/root "$vantle" -v 1 -q "$@" 2> "$folder/errors" ||
      status=$?
    grep -v '^This is a simulated hub' "$folder/errors" >&2 || true
  fi
  return "$status"
}

prepare() { # an empty handset
  rm -rf "$folder/root"
  mkdir -p "$folder/root/data/app-ephemeral" "$folder/root/mnt/vendor/persist/sensors/registry/registry"
}
