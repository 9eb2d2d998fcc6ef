#!/usr/bin/env bash
# Installs the Debian packages the project needs to build and test, when any is missing.
set -euo pipefail

# graphviz: the pictures (--emit=dot, the HTML report); chromium: the test that loads the HTML report;
# clang: the front end's libFuzzer target and the second compiler of the emitted C; valgrind: the install
# check runs a consumer project under it; doxygen: the API reference; python3: the code-size measurement.
packages=(g++ cmake ninja-build libgtest-dev libgmock-dev libbenchmark-dev graphviz chromium clang
  libclang-rt-14-dev valgrind doxygen python3)

missing=()
for package in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q "install ok installed" || missing+=("$package")
done
if [ ${#missing[@]} -gt 0 ]; then
  echo "installing: ${missing[*]}"
  sudo_cmd=()
  [ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
  "${sudo_cmd[@]}" apt-get update -qq
  DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq "${missing[@]}"
fi
