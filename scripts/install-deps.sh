#!/usr/bin/env bash
# Installs the Debian packages the library, tools and tests need, plus any packages named as
# arguments (the fuzzing and benchmark scripts add theirs), when any is missing.
set -euo pipefail
packages=(cmake g++ make pkg-config groff-base libjsoncpp-dev libsimdjson-dev libgtest-dev libcli11-dev libcpp-httplib-dev libmicrohttpd-dev libseccomp-dev libmagic-dev libxml2-dev libpoppler-cpp-dev libtag1-dev libexiv2-dev libarchive-dev libavformat-dev libavcodec-dev libavutil-dev curl "$@")
missing=()
for package in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q "install ok installed" || missing+=("$package")
done
if [ ${#missing[@]} -gt 0 ]; then
  echo "Installing: ${missing[*]}"
  sudo_cmd=""
  [ "$(id -u)" -eq 0 ] || sudo_cmd="sudo"
  $sudo_cmd apt-get update -qq
  DEBIAN_FRONTEND=noninteractive $sudo_cmd apt-get install -y -qq "${missing[@]}"
fi
