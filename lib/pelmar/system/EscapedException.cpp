// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/system/EscapedException.h"

#include "pelmar/core/Demangle.h"

#include <cxxabi.h>

#include <exception>

namespace Pelmar {
namespace System {

namespace {

std::string DescribeUnknown() {
  const std::type_info* const type = abi::__cxa_current_exception_type();
  return type == nullptr ? "an exception of another language" : GetTypeName(*type);
}

}  // namespace

std::string DescribeEscapedException() {
  try {
    throw;
  } catch (const std::exception& e) {
    return GetTypeName(typeid(e)) + ": " + e.what();
  } catch (const std::exception* e) {
    return e == nullptr ? DescribeUnknown() + ": null" : GetTypeName(typeid(*e)) + "*: " + e->what();
  } catch (...) {
    return DescribeUnknown();
  }
}

}  // namespace System
}  // namespace Pelmar
