// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SpareExpat.h"

#include "pelmar/core/PerThread.h"

#include <utility>

namespace Pelmar {
namespace Xml {

// Whoever parses takes the spare one away, so a handler may parse another document meanwhile.
ExpatHandle TakeExpat() {
  ExpatHandle* const spare = PerThread<ExpatHandle>::Get();
  return spare != nullptr && *spare ? std::move(*spare) : CreateExpat();
}

void KeepExpat(ExpatHandle parser, std::size_t bytes) noexcept {
  ExpatHandle* const spare = PerThread<ExpatHandle>::Get();
  if (spare != nullptr && bytes <= kMaxBytesOfSpareExpat &&
      XML_ParserReset(parser.get(), "UTF-8") == XML_TRUE) {
    *spare = std::move(parser);
  }
}

}  // namespace Xml
}  // namespace Pelmar
