#!/usr/bin/env bash
# Installs gnuplot (the Debian package without X) when it is missing; the plotting scripts call it.
set -euo pipefail

if ! command -v gnuplot > /dev/null; then
  sudo_cmd=()
  [ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
  "${sudo_cmd[@]}" apt-get update -qq
  DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq gnuplot-nox
fi
