// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A tokeniser that was used before and can be used again.

#ifndef PELMAR_XML_SPAREEXPAT_H
#define PELMAR_XML_SPAREEXPAT_H

#include "pelmar/xml/ExpatHandle.h"

#include <cstddef>

namespace Pelmar {
namespace Xml {

/// A tokeniser keeps memory in proportion to what it read, so only those that read little are kept.
constexpr std::size_t kMaxBytesOfSpareExpat = 64 * 1024;

/// The tokeniser that this thread keeps, or a new one: setting one up takes a third of the time that the text
/// of a small token takes. Throws std::bad_alloc.
ExpatHandle TakeExpat();

/// Keeps a tokeniser that read `bytes` without a fault for the thread's next document. Nothing of the
/// document stays in it: the reset also takes the handlers away, and the next document gets a hash salt of
/// its own.
void KeepExpat(ExpatHandle parser, std::size_t bytes) noexcept;

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SPAREEXPAT_H
