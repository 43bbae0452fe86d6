# Shared by the scripts of this folder; sourced, never run.
# shellcheck shell=bash

repository=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
jobs=${VANTLE_JOBS:-$(nproc)}

# Paths below the repository do not count: another checkout of the same files finds what this one compiled.
export CCACHE_BASEDIR=$repository CCACHE_NOHASHDIR=1

say() { printf '%s\n' "$*"; }

complain() { printf '%s: %s\n' "$(basename "$0")" "$*" >&2; }

# quietly LOG COMMAND...: keeps what COMMAND prints in LOG, and shows it only when COMMAND fails.
quietly() {
  local log=$1 status=0
  shift
  mkdir -p "$(dirname "$log")"
  "$@" >"$log" 2>&1 || status=$?
  if [ "$status" -ne 0 ]; then
    complain "failed with status $status: $*"
    tail -n 200 "$log" >&2
  fi
  return "$status"
}

# build_preset PRESET [TARGET...]: configures and builds, everything when no target is named.
build_preset() {
  local preset=$1 target arguments=()
  shift
  for target in "$@"; do arguments+=(--target "$target"); done
  cd "$repository" || return 1
  quietly "build/logs/$preset-configure.log" cmake --preset "$preset" || return 1
  quietly "build/logs/$preset-build.log" cmake --build --preset "$preset" -j "$jobs" "${arguments[@]}"
}
