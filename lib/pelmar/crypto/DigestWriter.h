// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A digest that is fed as a stream.

#ifndef PELMAR_CRYPTO_DIGESTWRITER_H
#define PELMAR_CRYPTO_DIGESTWRITER_H

#include <pelmar/Writer.h>
#include <pelmar/crypto/Digest.h>

#include <cstddef>
#include <memory>
#include <vector>

struct evp_md_ctx_st;
struct evp_md_st;

namespace Pelmar {
namespace Crypto {

/// OpenSSL's implementation of `algorithm`, looked up once per process. Never null; throws CryptoException.
const evp_md_st* GetDigestImplementation(DigestAlgorithm algorithm);

/// A writer that digests what it is given (FIPS 180-4). Used by one thread. Throws CryptoException.
class DigestWriter final : public Writer {
 public:
  explicit DigestWriter(DigestAlgorithm algorithm);
  ~DigestWriter() override;

  void Write(const char* data, std::size_t size) override;
  /// The digest of everything written. To be called once, after the last write.
  std::vector<unsigned char> Finish();

 private:
  struct ContextDeleter {
    void operator()(evp_md_ctx_st* context) const noexcept;
  };

  std::unique_ptr<evp_md_ctx_st, ContextDeleter> _context;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_DIGESTWRITER_H
