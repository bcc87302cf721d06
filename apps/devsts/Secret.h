// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text that must not stay behind in memory.

#ifndef QUORLIN_DEVSTS_SECRET_H
#define QUORLIN_DEVSTS_SECRET_H

#include <pelmar/SecretText.h>

namespace DevSts {

using Secret = Pelmar::SecretText;

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_SECRET_H
