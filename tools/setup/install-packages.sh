#!/bin/sh
# Installs what is missing of the Debian packages that the named purposes need (packages.txt).
#   install-packages.sh PURPOSE...
# Silent when nothing is missing. Says what to do when it cannot install.
set -eu

list=$(dirname "$0")/packages.txt
missing=
for purpose in "$@"; do
  for package in $(sed -n "s/^$purpose: //p" "$list"); do
    status=$(dpkg-query -W -f '${db:Status-Status}' "$package" 2>/dev/null || true)
    [ "$status" = installed ] || missing="$missing $package"
  done
done
[ -n "$missing" ] || exit 0

if ! command -v apt-get >/dev/null 2>&1; then
  echo "These packages are missing, and this is not a Debian system where they could be installed:" >&2
  echo " $missing" >&2
  exit 1
fi
run=
if [ "$(id -u)" -ne 0 ]; then
  if ! command -v sudo >/dev/null 2>&1; then
    echo "These packages are missing. Install them as root:" >&2
    echo "  apt-get install --no-install-recommends$missing" >&2
    exit 1
  fi
  run=sudo
fi
echo "Installing missing packages:$missing"
log=$(mktemp)
trap 'rm -f "$log"' EXIT
if ! { $run apt-get update -q && $run env DEBIAN_FRONTEND=noninteractive apt-get install -y -q --no-install-recommends $missing; } >"$log" 2>&1; then
  tail -n 20 "$log" >&2
  echo "The packages could not be installed (see above). Install them by hand:$missing" >&2
  exit 1
fi
