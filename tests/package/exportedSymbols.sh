#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# usage: exportedSymbols.sh LIBRARY LIST [--update]
#
# Compares what the shared library exports with the list of names that is checked in, so that a change of the binary interface
# is seen in review. --update writes the list anew.
set -euo pipefail
export LC_ALL=C

library=$1 list=$2
[[ -e $library ]] || {
  echo "there is no $library" >&2
  exit 2
}

# One line per symbol: its kind as nm has it (T code, D and B data, V and W weak) and its name. Constructors and
# destructors come in several forms of the same name.
exported() {
  nm --dynamic --defined-only --format=posix "$library" | awk '{ print $2, $1 }' | c++filt | sort --unique
}

if [[ ${3:-} == --update ]]; then
  exported >"$list"
  echo "wrote $list"
elif ! diff --unified "$list" <(exported); then
  echo "What $library exports is not what $list holds. If that is meant: ./dev abi symbols" >&2
  exit 1
fi
