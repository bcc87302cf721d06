// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Readable names of types and functions, for messages to developers.

#ifndef PELMAR_CORE_DEMANGLE_H
#define PELMAR_CORE_DEMANGLE_H

#include <string>
#include <typeinfo>

namespace Pelmar {

/// The source form of a name as the linker knows it (Itanium C++ ABI, 5.1); a name that is not mangled comes
/// back as it is.
std::string Demangle(const char* mangledName);

/// The source form of the name of a type.
inline std::string GetTypeName(const std::type_info& type) {
  return Demangle(type.name());
}

}  // namespace Pelmar

#endif  // PELMAR_CORE_DEMANGLE_H
