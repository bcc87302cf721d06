// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureReferenceImpl.h"

#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/Exception.h>

namespace Pelmar {
namespace Xml {
namespace Security {

SignatureReference::~SignatureReference() = default;

SignatureReferenceImpl::~SignatureReferenceImpl() = default;

void SignatureReferenceImpl::AddTransform(const std::string& algorithm) {
  if (_closed) {
    throw InvalidStateException("The signature exists already; nothing can be added to its references");
  }
  std::vector<std::string> transforms = _transforms;
  transforms.push_back(algorithm);
  RequireTransforms(transforms);
  _transforms.swap(transforms);
}

void SignatureReferenceImpl::Close(const std::vector<std::string>& transforms) {
  _transforms = transforms;
  _closed = true;
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
