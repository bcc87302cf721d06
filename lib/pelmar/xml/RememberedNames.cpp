// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/RememberedNames.h"

namespace Pelmar {
namespace Xml {

namespace {

constexpr std::size_t kMaxBytesOfPart = 64;

std::size_t ByteAt(std::string_view text, std::size_t position) noexcept {
  return static_cast<unsigned char>(text[position]);
}

}  // namespace

Ref<const ElementName> RememberedNames::Find(const NameParts& parts) const noexcept {
  if (parts.localName.empty()) {
    return nullptr;
  }
  const Ref<const ElementName>& name = _names[PlaceOf(parts)];
  const bool isThat = name && name->localName == parts.localName && name->prefix == parts.prefix;
  return isThat ? name : nullptr;
}

void RememberedNames::Remember(const Ref<const ElementName>& name) noexcept {
  if (name->prefix.size() <= kMaxBytesOfPart && name->localName.size() <= kMaxBytesOfPart) {
    _names[PlaceOf({name->prefix, name->localName})] = name;
  }
}

// The names that a request or a token uses, a few dozen, hardly ever meet.
std::size_t RememberedNames::PlaceOf(const NameParts& parts) noexcept {
  const std::string_view local = parts.localName;
  return (local.size() * 31 + ByteAt(local, local.size() - 1) * 7 + ByteAt(local, local.size() / 2) * 17 +
          ByteAt(local, 0) + parts.prefix.size() * 3) %
         kNames;
}

}  // namespace Xml
}  // namespace Pelmar
