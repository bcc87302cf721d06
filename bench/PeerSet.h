// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The peers that were found when this program was built (bench/peers), ready to be measured.

#ifndef QUORLIN_BENCH_PEERSET_H
#define QUORLIN_BENCH_PEERSET_H

#include "bench/Measure.h"
#include "bench/PeerProcess.h"
#include "bench/Tokens.h"

#include <memory>
#include <string>
#include <vector>

namespace Bench {

class PeerSet final {
 public:
  /// Writes the sample tokens into `directory`, as files NAME.xml and NAME.pem; starts every peer that was
  /// found, sees that each accepts the tokens and refuses a changed and a foreign one, and warms it up. A
  /// peer that errs is not measured.
  explicit PeerSet(const std::string& directory);

  /// The peers that can validate this one of GetSampleTokens().
  std::vector<Contender> GetContenders(const SampleToken& token) const;

  /// A sentence for each peer that is not measured.
  const std::vector<std::string>& GetAbsent() const { return _absent; }

 private:
  struct Peer {
    std::shared_ptr<PeerProcess> process;
    bool isNative;
    bool checksChain;
  };

  void Start(const std::vector<std::string>& fields, const std::vector<std::string>& arguments,
             const std::string& directory);

  std::vector<Peer> _peers;
  std::vector<std::string> _absent;
};

}  // namespace Bench

#endif  // QUORLIN_BENCH_PEERSET_H
