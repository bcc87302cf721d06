// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A source of bytes that is read once, from front to back.

#ifndef PELMAR_READER_H
#define PELMAR_READER_H

#include <pelmar/Object.h>
#include <pelmar/Ref.h>

#include <cstddef>
#include <string>

namespace Pelmar {

/// A stream of bytes. Used by one thread at a time.
class PELMAR_API Reader : public Object {
 public:
  /// Copies up to `size` bytes into `buffer` and returns how many; 0 means the end (when `size` is not 0).
  virtual std::size_t Read(char* buffer, std::size_t size) = 0;

 protected:
  ~Reader() override;
};

/// A reader over a copy of `text`.
PELMAR_API Ref<Reader> CreateStringReader(std::string text);

}  // namespace Pelmar

#endif  // PELMAR_READER_H
