// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Naming the exception that a handler for everything has caught.

#ifndef PELMAR_SYSTEM_ESCAPEDEXCEPTION_H
#define PELMAR_SYSTEM_ESCAPEDEXCEPTION_H

#include <string>

namespace Pelmar {
namespace System {

/// Called within a handler: the dynamic class of the exception being handled (with a "*" if it was thrown by
/// pointer) and, for a `std::exception`, ": " and its message. An object thrown by pointer is left alone,
/// since nobody knows who owns it.
std::string DescribeEscapedException();

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_ESCAPEDEXCEPTION_H
