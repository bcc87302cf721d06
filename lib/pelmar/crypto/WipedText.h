// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A secret text that does not stay behind in memory.

#ifndef PELMAR_CRYPTO_WIPEDTEXT_H
#define PELMAR_CRYPTO_WIPEDTEXT_H

#include <openssl/crypto.h>

#include <string>

namespace Pelmar {
namespace Crypto {

/// Owns a text and overwrites all the memory it has when it goes. Neither copied nor moved: made in place
/// from what a function returns, or filled within a size that was reserved.
class WipedText final {
 public:
  WipedText() = default;
  template <typename Function>
  explicit WipedText(const Function& make) : text(make()) {}
  WipedText(const WipedText&) = delete;
  WipedText& operator=(const WipedText&) = delete;
  ~WipedText() {
    text.resize(text.capacity());
    OPENSSL_cleanse(text.data(), text.size());
  }

  std::string text;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_WIPEDTEXT_H
