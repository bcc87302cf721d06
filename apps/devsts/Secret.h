// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text that must not stay behind in memory.

#ifndef QUORLIN_DEVSTS_SECRET_H
#define QUORLIN_DEVSTS_SECRET_H

#include <openssl/crypto.h>

#include <cstddef>
#include <string>

namespace DevSts {

/// Owns a text and overwrites it when it goes. Cannot be copied, so there is one place to look after.
class Secret final {
 public:
  Secret() = default;
  explicit Secret(const std::string& text) : _text(text) {}
  Secret(const char* data, std::size_t size) : _text(data, size) {}
  Secret(Secret&& other) : _text(other._text) { other.Wipe(); }
  Secret& operator=(Secret&& other) {
    Wipe();
    _text = other._text;
    other.Wipe();
    return *this;
  }
  Secret(const Secret&) = delete;
  Secret& operator=(const Secret&) = delete;
  ~Secret() { Wipe(); }

  const std::string& Reveal() const { return _text; }

 private:
  void Wipe() {
    OPENSSL_cleanse(_text.data(), _text.size());
    _text.clear();
  }

  std::string _text;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_SECRET_H
