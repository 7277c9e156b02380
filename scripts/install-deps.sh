#!/usr/bin/env bash
# Installs the Debian packages that building and testing vrxmtrk need.
# Quick and silent when everything is present; prints the apt-get line
# instead of running it when not run as root.
set -euo pipefail

# package:file-that-shows-it-is-installed
needs=(
  cmake:/usr/bin/cmake
  ninja-build:/usr/bin/ninja
  g++:/usr/bin/g++
  make:/usr/bin/make
  gettext:/usr/bin/msgfmt
  nlohmann-json3-dev:/usr/include/nlohmann/json.hpp
  libgtest-dev:/usr/include/gtest/gtest.h
  libgmock-dev:/usr/include/gmock/gmock.h
  clang:/usr/bin/clang++
  libclang-rt-14-dev:/usr/lib/llvm-14/lib/clang/14.0.6/lib/linux/libclang_rt.fuzzer-x86_64.a
)
# A target that needs more passes it in VRX_EXTRA_DEPS, in the same form
# (make coverage passes gcovr:/usr/bin/gcovr), so that the others go without.
[ "${VRX_EXTRA_DEPS:-}" ] && needs+=(${VRX_EXTRA_DEPS})

missing=()
for entry in "${needs[@]}"; do
  pkg=${entry%%:*}
  file=${entry#*:}
  [ -e "$file" ] || missing+=("$pkg")
done
[ ${#missing[@]} -eq 0 ] && exit 0

if [ "$(id -u)" -ne 0 ]; then
  echo "vrxmtrk needs these packages; install them as root with:" >&2
  echo "  apt-get install -y ${missing[*]}" >&2
  exit 1
fi
export DEBIAN_FRONTEND=noninteractive
echo "Installing: ${missing[*]}" >&2
if ! apt-get install -y -qq "${missing[@]}" >/dev/null; then
  apt-get update -qq
  apt-get install -y -qq "${missing[@]}" >/dev/null
fi
