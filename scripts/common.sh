# shellcheck shell=bash
# What ./run and ./check share. To be sourced, with `repository` set to the repository's directory.

step() {
  printf '== %s\n' "$*"
}

fail() {
  printf '%s: %s\n' "${0##*/}" "$*" >&2
  exit "${failure_status:-1}"
}

# The packages of the named groups of packages.txt.
packages_of() {
  local group line
  group=
  while read -r line; do
    case "$line" in
      '' | '#'*) ;;
      '['*']') group=${line:1:-1} ;;
      *) if [[ " $* " == *" $group "* ]]; then printf '%s\n' "$line"; fi ;;
    esac
  done < "${repository:?}/packages.txt"
}

missing_packages_of() {
  local package status
  for package in $(packages_of "$@"); do
    status=$(dpkg-query --show --showformat '${db:Status-Status}' "$package" 2> /dev/null || true)
    if [[ $status != installed ]]; then printf '%s\n' "$package"; fi
  done
}

as_root() {
  if ((EUID == 0)); then
    "$@"
  elif command -v sudo > /dev/null; then
    sudo "$@"
  else
    fail "needs root, or sudo, to run: $*"
  fi
}

apt_get() {
  as_root env DEBIAN_FRONTEND=noninteractive apt-get --quiet=2 -o DPkg::Lock::Timeout=300 -o Dpkg::Use-Pty=0 "$@" < /dev/null
}

# Installs what is missing of the named groups; does not touch apt when nothing is.
install_packages() {
  local -a missing
  mapfile -t missing < <(missing_packages_of "$@")
  if ((${#missing[@]} == 0)); then return; fi
  step "Installing ${#missing[@]} packages: ${missing[*]}"
  apt_get update || fail 'apt-get update failed'
  apt_get install --yes --no-install-recommends "${missing[@]}" || fail 'installing packages failed'
}
