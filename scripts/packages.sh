# Installing Debian packages; sourced after common.sh, never run.
# shellcheck shell=bash

readonly install_attempts=4

# missing_packages PACKAGE...: those that are not installed, one a line.
missing_packages() {
  local package
  for package in "$@"; do
    [ "$(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null)" = installed ] || printf '%s\n' "$package"
  done
}

as_root() {
  if [ "$(id -u)" -eq 0 ]; then
    env DEBIAN_FRONTEND=noninteractive "$@"
  elif command -v sudo >/dev/null; then
    sudo -n env DEBIAN_FRONTEND=noninteractive "$@"
  else
    complain "neither root nor sudo is there to run: $*"
    return 1
  fi
}

apt() {
  as_root apt-get -qq -o DPkg::Lock::Timeout=120 -o Acquire::Retries=3 "$@"
}

have_package_lists() { compgen -G '/var/lib/apt/lists/*_Packages*' >/dev/null; }

# with_package_lists COMMAND...: runs a command that takes packages from the mirror until it succeeds. Fresh
# images come without package lists; old lists name packages that the mirror no longer has.
with_package_lists() {
  local attempt
  for ((attempt = 1; attempt <= install_attempts; ++attempt)); do
    if ! have_package_lists || [ "$attempt" -gt 1 ]; then apt update || true; fi
    if "$@"; then return 0; fi
    complain "attempt $attempt of $install_attempts to get packages failed"
    if [ "$attempt" -lt "$install_attempts" ]; then sleep $((attempt * 5)); fi
  done
  return 1
}

# install_packages PACKAGE...: looks first and installs only what is missing, so that a second run takes no time
# and no network. Ends the script when that cannot be done.
install_packages() {
  local missing=()
  if ! command -v dpkg-query >/dev/null; then
    complain "this is no Debian system; install the equivalents of: $*"
    exit 1
  fi
  mapfile -t missing < <(missing_packages "$@")
  [ "${#missing[@]}" -gt 0 ] || return 0
  say "Installing ${missing[*]}"
  with_package_lists apt install --yes --no-install-recommends "${missing[@]}" >/dev/null || true
  mapfile -t missing < <(missing_packages "$@")
  if [ "${#missing[@]}" -gt 0 ]; then
    complain "still missing: ${missing[*]}"
    exit 1
  fi
}
