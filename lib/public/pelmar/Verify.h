// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Fatal checks of internal invariants: what cannot be caused by a caller's data, and so is never an
// exception.

#ifndef PELMAR_VERIFY_H
#define PELMAR_VERIFY_H

#include <pelmar/Export.h>

namespace Pelmar {

/// Writes `condition` and `source` to standard error as "Verify failed: <condition> (<source>)" and aborts
/// the process.
[[noreturn]] PELMAR_API void VerifyFailed(const char* condition, const char* source) noexcept;

/// Aborts through `VerifyFailed` unless `holds`. `condition` is the text to report, `source` the reporting
/// source without its extension (for example "lib/quorlin/SamlTokenImpl").
inline void Verify(bool holds, const char* condition, const char* source) noexcept {
  if (!holds) {
    VerifyFailed(condition, source);
  }
}

/// Marks a branch that no input can reach; aborts, naming `source`.
[[noreturn]] PELMAR_API void PanicNotReached(const char* source) noexcept;

}  // namespace Pelmar

#endif  // PELMAR_VERIFY_H
