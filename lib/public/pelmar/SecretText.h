// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Texts and bytes that must not stay behind in memory: passwords, pass phrases, private keys.

#ifndef PELMAR_SECRETTEXT_H
#define PELMAR_SECRETTEXT_H

#include <pelmar/Export.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {

/// Overwrites `size` bytes with zeros, also where the compiler sees that nobody reads them any more. Null
/// with a size of 0 is fine.
PELMAR_API void Wipe(void* data, std::size_t size) noexcept;

/// Overwrites all memory that the text or the bytes hold, beyond their end too, and leaves them empty. What
/// an earlier growth has left behind elsewhere cannot be reached any more: reserve before filling.
PELMAR_API void Wipe(std::string& text) noexcept;
PELMAR_API void Wipe(std::vector<unsigned char>& bytes) noexcept;

/// Owns a text and wipes it when it goes or gets another one. A copy is a text of its own, which is wiped in
/// its turn. What it is made from is the caller's to wipe, unless it is moved from.
///
/// Threads: like a std::string.
class PELMAR_API SecretText final {
 public:
  SecretText();
  /// Not explicit, like the way back: a secret takes the place of a text in a signature or a bound call.
  SecretText(const std::string& text);
  /// Takes the text over and wipes what is left behind, which for a short text is all of it.
  SecretText(std::string&& text);
  SecretText(const SecretText& other);
  SecretText(SecretText&& other) noexcept;
  SecretText& operator=(const SecretText& other);
  SecretText& operator=(SecretText&& other) noexcept;
  ~SecretText();

  /// Valid as long as this object is there and unchanged.
  const std::string& Reveal() const noexcept { return _text; }
  operator const std::string&() const noexcept { return _text; }

 private:
  std::string _text;
};

}  // namespace Pelmar

#endif  // PELMAR_SECRETTEXT_H
