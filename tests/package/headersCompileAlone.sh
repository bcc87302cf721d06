#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# usage: headersCompileAlone.sh COMPILER FOLDER
#
# Compiles each header below FOLDER on its own, in every language version from C++11 on; every warning is an
# error. The token provider's headers have a folder of their own, and are included like the library's.
set -euo pipefail

export compiler=$1 folder=$2
readonly versions=(11 14 17 20)

check() {
  local version=$1 header=$2
  "$compiler" "-std=c++$version" -Wall -Wextra -Wpedantic -Werror -fsyntax-only -I "$folder" \
    -I "$folder/quorlin-provider" -include "$header" \
    -x c++ /dev/null || {
    echo "$header does not compile alone as C++$version with $compiler" >&2
    return 1
  }
}
export -f check

headers=$(cd "$folder" && find . -name '*.h' -printf '%P\n' | sort)
[[ -n $headers ]] || {
  echo "there is no header in $folder" >&2
  exit 2
}
for version in "${versions[@]}"; do
  sed "s/^/$version /" <<<"$headers"
done | xargs --max-procs="$(nproc)" --max-args=2 bash -c 'check "$@"' check
echo "$(wc -l <<<"$headers") headers, C++ ${versions[*]}, $("$compiler" --version | head -n 1): no warning"
