#!/bin/sh
# Installs the Debian 12 packages that building and testing Docuvane need,
# only those that are missing.
set -eu

packages="build-essential cmake ninja-build pkg-config
libwxgtk3.2-dev libfontconfig-dev libcurl4-openssl-dev libpoppler-glib-dev
libgtest-dev libgmock-dev libbenchmark-dev
xvfb xauth xdg-utils curl fonts-dejavu-core clang-format
hicolor-icon-theme adwaita-icon-theme
desktop-file-utils appstream dpkg-dev"

missing=""
for p in $packages; do
  status=$(dpkg-query -W -f='${Status}' "$p" 2>/dev/null || true)
  case "$status" in
    *"install ok installed"*) ;;
    *) missing="$missing $p" ;;
  esac
done

if [ -z "$missing" ]; then
  echo "install-deps: everything is installed"
  exit 0
fi

echo "install-deps: installing$missing"
if [ "$(id -u)" -eq 0 ]; then sudo=""; else sudo="sudo"; fi
export DEBIAN_FRONTEND=noninteractive
$sudo apt-get update -qq
# shellcheck disable=SC2086
$sudo apt-get install -y -qq --no-install-recommends $missing
