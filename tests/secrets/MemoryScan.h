// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Looks for secrets in the memory of this process, without ever holding one itself.

#ifndef QUORLIN_TESTS_SECRETS_MEMORYSCAN_H
#define QUORLIN_TESTS_SECRETS_MEMORYSCAN_H

#include <cstddef>
#include <string>
#include <vector>

namespace Secrets {

/// Each byte of a secret is kept combined with this by exclusive or, and so is found nowhere.
constexpr unsigned char kMask = 0xA5;

/// So many bytes of a secret in a row count as a copy: what is left of one that was half overwritten, too.
constexpr std::size_t kPieceBytes = 8;

/// Two digits per byte of `bytes`, masked.
std::string Mask(const std::string& bytes);

/// A secret of at least kPieceBytes bytes.
class MaskedSecret final {
 public:
  /// `digits` is what Mask gave. Throws std::invalid_argument.
  explicit MaskedSecret(const std::string& digits);

  /// Replaces `text`, in a single block of memory, which is the caller's to wipe.
  void Reveal(std::string& text) const;
  const std::vector<unsigned char>& GetMasked() const { return _masked; }

 private:
  std::vector<unsigned char> _masked;
};

/// Where in the writable memory of this process pieces of the secrets stand; one line for each run of bytes:
/// the mapping, and what stands around it, with "#" for the bytes of secrets.
std::vector<std::string> FindInMemory(const std::vector<MaskedSecret>& secrets);

}  // namespace Secrets

#endif  // QUORLIN_TESTS_SECRETS_MEMORYSCAN_H
