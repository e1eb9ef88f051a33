#!/usr/bin/env bash
# Installs everything the project builds, tests and benchmarks with, from
# Debian 12's packages. Safe to run more than once.
set -euo pipefail

packages=(
  build-essential g++ clang cmake ninja-build ccache pkg-config git
  libicu-dev uuid-dev nettle-dev
  libavformat-dev libavcodec-dev libavutil-dev
  googletest libgtest-dev libgmock-dev libbenchmark-dev
  g++-mingw-w64-x86-64-posix wine64
  gstreamer1.0-plugins-base gstreamer1.0-plugins-good gstreamer1.0-libav
  libsndfile1-dev sndfile-programs sox ffmpeg
  libboost-dev libmimalloc-dev libjemalloc-dev libgoogle-perftools-dev
  clang-format libclang-rt-14-dev mediainfo gcovr
)

missing=()
for p in "${packages[@]}"; do
  dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed" || missing+=("$p")
done

if [ ${#missing[@]} -gt 0 ]; then
  sudo=""
  [ "$(id -u)" -eq 0 ] || sudo="sudo"
  $sudo apt-get update -q
  DEBIAN_FRONTEND=noninteractive $sudo apt-get install -y -q --no-install-recommends "${missing[@]}"
fi
echo "setup: all packages present"
