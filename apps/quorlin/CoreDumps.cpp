// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CoreDumps.h"

#include <sys/prctl.h>
#include <sys/resource.h>

namespace Cli {

// Both: the limit does not hold for a dump that is piped to a program (core(5)), and the flag does not
// outlast an exec.
bool ForbidCoreDumps() {
  const rlimit none = {0, 0};
  return setrlimit(RLIMIT_CORE, &none) == 0 && prctl(PR_SET_DUMPABLE, 0, 0, 0, 0) == 0;
}

}  // namespace Cli
