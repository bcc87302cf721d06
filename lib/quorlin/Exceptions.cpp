// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/Exceptions.h>

namespace Quorlin {

SsoException::SsoException(const std::string& message) : Pelmar::Exception(message) {}

SsoException::SsoException(const SsoException& other) noexcept = default;

SsoException::~SsoException() noexcept = default;

Pelmar::Exception* SsoException::Clone() const {
  return new SsoException(*this);
}

void SsoException::Throw() const {
  throw SsoException(*this);
}

InvalidTokenException::InvalidTokenException(const std::string& message) : SsoException(message) {}

InvalidTokenException::InvalidTokenException(const InvalidTokenException& other) noexcept = default;

InvalidTokenException::~InvalidTokenException() noexcept = default;

Pelmar::Exception* InvalidTokenException::Clone() const {
  return new InvalidTokenException(*this);
}

void InvalidTokenException::Throw() const {
  throw InvalidTokenException(*this);
}

InvalidSignatureException::InvalidSignatureException(const std::string& message)
    : InvalidTokenException(message) {}

InvalidSignatureException::InvalidSignatureException(const InvalidSignatureException& other) noexcept =
    default;

InvalidSignatureException::~InvalidSignatureException() noexcept = default;

Pelmar::Exception* InvalidSignatureException::Clone() const {
  return new InvalidSignatureException(*this);
}

void InvalidSignatureException::Throw() const {
  throw InvalidSignatureException(*this);
}

ParseException::ParseException(const std::string& message) : InvalidTokenException(message) {}

ParseException::ParseException(const ParseException& other) noexcept = default;

ParseException::~ParseException() noexcept = default;

Pelmar::Exception* ParseException::Clone() const {
  return new ParseException(*this);
}

void ParseException::Throw() const {
  throw ParseException(*this);
}

CommunicationException::CommunicationException(const std::string& message) : SsoException(message) {}

CommunicationException::CommunicationException(const CommunicationException& other) noexcept = default;

CommunicationException::~CommunicationException() noexcept = default;

Pelmar::Exception* CommunicationException::Clone() const {
  return new CommunicationException(*this);
}

void CommunicationException::Throw() const {
  throw CommunicationException(*this);
}

InvalidCredentialsException::InvalidCredentialsException(const std::string& message)
    : SsoException(message) {}

InvalidCredentialsException::InvalidCredentialsException(const InvalidCredentialsException& other) noexcept =
    default;

InvalidCredentialsException::~InvalidCredentialsException() noexcept = default;

Pelmar::Exception* InvalidCredentialsException::Clone() const {
  return new InvalidCredentialsException(*this);
}

void InvalidCredentialsException::Throw() const {
  throw InvalidCredentialsException(*this);
}

}  // namespace Quorlin
