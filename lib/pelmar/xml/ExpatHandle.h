// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owner of an expat parser.

#ifndef PELMAR_XML_EXPATHANDLE_H
#define PELMAR_XML_EXPATHANDLE_H

#include <expat.h>

#include <memory>
#include <new>

namespace Pelmar {
namespace Xml {

struct ExpatDeleter {
  void operator()(XML_Parser parser) const noexcept { XML_ParserFree(parser); }
};

using ExpatHandle = std::unique_ptr<XML_ParserStruct, ExpatDeleter>;

/// A parser that gives names as written. Throws std::bad_alloc.
inline ExpatHandle CreateExpat() {
  ExpatHandle parser(XML_ParserCreate("UTF-8"));
  if (!parser) {
    throw std::bad_alloc();
  }
  return parser;
}

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_EXPATHANDLE_H
