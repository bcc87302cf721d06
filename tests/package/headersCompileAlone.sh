#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# usage: headersCompileAlone.sh COMPILER FOLDER
#
# Compiles each header below FOLDER on its own, in every language version from C++11 on; every warning is an
# error. The token provider's headers have a folder of their own, and are included like the library's. One header is C++20, and
# has to say so to an older compiler.
set -euo pipefail

export compiler=$1 folder=$2
export modern=quorlin/Coroutine.h
readonly versions=(11 14 17 20)

# Refused, and the header itself says why.
check_refusal() {
  local version=$1 complaints
  if complaints=$("$compiler" "-std=c++$version" -fsyntax-only -I "$folder" -include "$modern" -x c++ /dev/null 2>&1); then
    echo "$modern compiles as C++$version with $compiler" >&2
    return 1
  fi
  grep -qF "quorlin/Coroutine.h needs C++20" <<<"$complaints" || {
    echo "$modern does not say that C++$version is too old for it" >&2
    return 1
  }
}

check() {
  local version=$1 header=$2
  if [[ $header == "$modern" && $version -lt 20 ]]; then
    check_refusal "$version"
    return
  fi
  "$compiler" "-std=c++$version" -Wall -Wextra -Wpedantic -Werror -fsyntax-only -I "$folder" \
    -I "$folder/quorlin-provider" -include "$header" \
    -x c++ /dev/null || {
    echo "$header does not compile alone as C++$version with $compiler" >&2
    return 1
  }
}
export -f check check_refusal

headers=$(cd "$folder" && find . -name '*.h' -printf '%P\n' | sort)
[[ -n $headers ]] || {
  echo "there is no header in $folder" >&2
  exit 2
}
[[ -e $folder/$modern ]] || {
  echo "there is no $modern in $folder" >&2
  exit 2
}
for version in "${versions[@]}"; do
  sed "s/^/$version /" <<<"$headers"
done | xargs --max-procs="$(nproc)" --max-args=2 bash -c 'check "$@"' check
echo "$(wc -l <<<"$headers") headers, C++ ${versions[*]}, $("$compiler" --version | head -n 1): no warning"
