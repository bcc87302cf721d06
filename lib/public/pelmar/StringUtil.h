// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Small text services: base64, identifiers, letter case.

#ifndef PELMAR_STRINGUTIL_H
#define PELMAR_STRINGUTIL_H

#include <pelmar/Export.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace StringUtil {

/// Base64 text of `bytes` (RFC 4648, section 4: standard alphabet, padded), without line breaks.
PELMAR_API std::string Base64Encode(const std::vector<unsigned char>& bytes);

/// The bytes that `text` stands for. The white space of XML (tab, line feed, carriage return, blank) may
/// stand anywhere, as XML Schema's base64Binary allows; everything else must be exact: alphabet, length,
/// padding, zero trailing bits. Throws Base64FormatException, whose message never repeats the text.
PELMAR_API std::vector<unsigned char> Base64Decode(const std::string& text);

/// A fresh random UUID (RFC 4122, version 4) in its lower-case text form, 36 characters.
PELMAR_API std::string GenerateUuid();

/// Maps the 26 ASCII letters and leaves every other byte as it is, whatever the process's locale.
PELMAR_API std::string ToLower(const std::string& text);
PELMAR_API std::string ToUpper(const std::string& text);

/// Whether `text` is well-formed UTF-8 made only of characters that XML 1.0 can carry (XML 1.0, production
/// 2).
PELMAR_API bool IsXmlText(const std::string& text);

/// Overwrites all memory that `text` holds, in a way that no compiler leaves out, and makes it empty. For
/// passwords that are no longer needed; copies made before are not reached.
PELMAR_API void Wipe(std::string& text) noexcept;

}  // namespace StringUtil
}  // namespace Pelmar

#endif  // PELMAR_STRINGUTIL_H
