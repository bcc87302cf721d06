// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text made safe for one line of a terminal or a log file.

#ifndef PELMAR_SERVICE_LOGESCAPE_H
#define PELMAR_SERVICE_LOGESCAPE_H

#include <string>

namespace Pelmar {
namespace Service {

/// `text` with each byte that could end the line or steer a terminal written as "\xhh": the control
/// characters C0, DEL and C1, the line and paragraph separators U+2028 and U+2029, and whatever is not UTF-8.
/// What comes from outside, such as a user name, can then neither forge a line nor hide one.
std::string EscapeForLog(const std::string& text);

}  // namespace Service
}  // namespace Pelmar

#endif  // PELMAR_SERVICE_LOGESCAPE_H
