// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A password on its way from the host's callback to the request.

#ifndef QUORLIN_PROVIDER_SECRET_H
#define QUORLIN_PROVIDER_SECRET_H

#include <cstddef>
#include <string>
#include <utility>

namespace Quorlin {

/// Sets the bytes to zero, also where the compiler can see that nobody reads them any more.
void Wipe(char* bytes, std::size_t count) noexcept;

/// Owns a text, and overwrites it before its memory is given back.
class Secret final {
 public:
  /// Takes the text over. What is left in `text` is wiped too: a short one lives inside the object.
  explicit Secret(std::string&& text) : _text(std::move(text)) { WipeAll(text); }
  Secret(const Secret&) = delete;
  Secret& operator=(const Secret&) = delete;
  ~Secret() { WipeAll(_text); }

  const std::string& Get() const { return _text; }

 private:
  // All that the text has room for: a longer one may have stood there before.
  static void WipeAll(std::string& text) noexcept {
    text.resize(text.capacity());
    Wipe(&text[0], text.size());
    text.clear();
  }

  std::string _text;
};

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_SECRET_H
