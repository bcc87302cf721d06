// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Names of elements that come again.

#ifndef PELMAR_XML_REMEMBEREDNAMES_H
#define PELMAR_XML_REMEMBEREDNAMES_H

#include "pelmar/xml/NameRules.h"

#include <pelmar/Ref.h>
#include <pelmar/xml/Node.h>

#include <array>
#include <cstddef>

namespace Pelmar {
namespace Xml {

/// Names repeat, within a document and from one to the next. Each has one place where it may be remembered,
/// and whoever comes later to that place takes it over: a foreign document can have a hundred thousand names,
/// chosen so as to meet in any table that keeps them all.
///
/// Threads: belongs to one.
class RememberedNames final {
 public:
  /// The name of these parts; null when it is not remembered.
  Ref<const ElementName> Find(const NameParts& parts) const noexcept;
  /// A long name is not remembered.
  void Remember(const Ref<const ElementName>& name) noexcept;

 private:
  static constexpr std::size_t kNames = 128;

  static std::size_t PlaceOf(const NameParts& parts) noexcept;

  std::array<Ref<const ElementName>, kNames> _names;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_REMEMBEREDNAMES_H
