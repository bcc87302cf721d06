// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>

#include "pelmar/core/Backtrace.h"
#include "pelmar/core/Demangle.h"

#include <sstream>

namespace Pelmar {

struct Throwable::Record {
  std::string message;
  std::vector<void*> backtrace;
};

Throwable::Throwable(const std::string& message)
    : _record(std::make_shared<const Record>(Record{message, CaptureBacktrace()})) {}

Throwable::Throwable(const Throwable& other) noexcept = default;

Throwable& Throwable::operator=(const Throwable& other) noexcept = default;

Throwable::~Throwable() noexcept = default;

const char* Throwable::what() const noexcept {
  return _record->message.c_str();
}

const std::vector<void*>& Throwable::GetBacktrace() const {
  return _record->backtrace;
}

std::string Throwable::Dump() const {
  std::ostringstream text;
  text << GetTypeName(typeid(*this)) << ": " << _record->message << "\n";
  std::size_t number = 0;
  for (void* const returnAddress : _record->backtrace) {
    text << "  #" << number++ << " " << DescribeFrame(returnAddress) << "\n";
  }
  return text.str();
}

std::string Throwable::Where() const {
  return DescribeRaisingFrame(_record->backtrace);
}

Exception::Exception(const std::string& message) : Throwable(message) {}

Exception::Exception(const Exception& other) noexcept = default;

Exception::~Exception() noexcept = default;

Exception* Exception::Clone() const {
  return new Exception(*this);
}

void Exception::Throw() const {
  throw Exception(*this);
}

InvalidArgumentException::InvalidArgumentException(const std::string& reason)
    : Exception("Invalid argument : " + reason) {}

InvalidArgumentException::InvalidArgumentException(const InvalidArgumentException& other) noexcept = default;

InvalidArgumentException::~InvalidArgumentException() noexcept = default;

Exception* InvalidArgumentException::Clone() const {
  return new InvalidArgumentException(*this);
}

void InvalidArgumentException::Throw() const {
  throw InvalidArgumentException(*this);
}

InvalidStateException::InvalidStateException(const std::string& message) : Exception(message) {}

InvalidStateException::InvalidStateException(const InvalidStateException& other) noexcept = default;

InvalidStateException::~InvalidStateException() noexcept = default;

Exception* InvalidStateException::Clone() const {
  return new InvalidStateException(*this);
}

void InvalidStateException::Throw() const {
  throw InvalidStateException(*this);
}

TypeMismatchException::TypeMismatchException(const std::string& message) : Exception(message) {}

TypeMismatchException::TypeMismatchException(const TypeMismatchException& other) noexcept = default;

TypeMismatchException::~TypeMismatchException() noexcept = default;

Exception* TypeMismatchException::Clone() const {
  return new TypeMismatchException(*this);
}

void TypeMismatchException::Throw() const {
  throw TypeMismatchException(*this);
}

Base64FormatException::Base64FormatException(const std::string& message) : Exception(message) {}

Base64FormatException::Base64FormatException(const Base64FormatException& other) noexcept = default;

Base64FormatException::~Base64FormatException() noexcept = default;

Exception* Base64FormatException::Clone() const {
  return new Base64FormatException(*this);
}

void Base64FormatException::Throw() const {
  throw Base64FormatException(*this);
}

}  // namespace Pelmar
