// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A sink of bytes, and the one that keeps them as a string.

#ifndef PELMAR_WRITER_H
#define PELMAR_WRITER_H

#include <pelmar/Object.h>
#include <pelmar/Ref.h>

#include <cstddef>
#include <string>

namespace Pelmar {

/// Takes bytes in order. Used by one thread at a time.
class PELMAR_API Writer : public Object {
 public:
  virtual void Write(const char* data, std::size_t size) = 0;

 protected:
  ~Writer() override;
};

/// A writer that collects what it is given.
class PELMAR_API StringWriter : public Writer {
 public:
  /// Everything written so far. The reference is valid until the next write.
  virtual const std::string& GetText() const = 0;

 protected:
  ~StringWriter() override;
};

PELMAR_API Ref<StringWriter> CreateStringWriter();

/// The same for a text with secrets in it: whatever memory it had is wiped when it is given back.
PELMAR_API Ref<StringWriter> CreateSecretStringWriter();

}  // namespace Pelmar

#endif  // PELMAR_WRITER_H
