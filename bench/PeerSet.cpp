// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/PeerSet.h"

#include "quorlin/Namespaces.h"

#include <boost/algorithm/string/classification.hpp>
#include <boost/algorithm/string/split.hpp>

#include <algorithm>
#include <fstream>
#include <stdexcept>

namespace Bench {

using namespace TestSupport;

namespace {

/// A just-in-time compiler comes to rest when so many batches for each token have made nothing faster.
constexpr double kBatchMicroseconds = 100000;
constexpr double kLeastMicroseconds = 10;  // No peer is that quick.
constexpr std::size_t kRestfulBatches = 12;
constexpr std::size_t kMaxBatches = 150;
constexpr double kImprovement = 0.97;
/// No native peer may be faster than we are; else `--check` fails.
constexpr double kLeastRatioOfNativePeers = 1;

/// The tokens that the peers are measured with. The one with 50,000 groups is too long for some of them.
struct Sample {
  const char* fileName;
  const SampleToken& token;
  bool needsChain;
};

const std::vector<Sample>& GetSamples() {
  static const std::vector<Sample> samples = {{"small", GetSampleTokens().small, false},
                                              {"medium", GetSampleTokens().medium, false},
                                              {"large", GetSampleTokens().large, false},
                                              {"issued", GetSampleTokens().issued, true}};
  return samples;
}

void WriteFile(const std::string& path, const std::string& content) {
  std::ofstream file(path, std::ios::binary);
  file << content;
  file.close();
  if (!file) {
    throw std::runtime_error("cannot write " + path);
  }
}

void WriteToken(const std::string& path, const SampleToken& token) {
  WriteFile(path + ".xml", token.text);
  WriteFile(path + ".pem", token.trusted.front()->ToPem());
}

/// Tokens that nobody may accept: one with a byte changed in a group's name, one of a signer who is not
/// trusted.
void WriteBadTokens(const std::string& directory) {
  const std::string changed = ReplaceOnce(GetSampleTokens().small.text, "-Site-3-", "-Site-4-");
  CertificateSpec spec;
  spec.keyNumber = 4;
  const std::string foreign =
      SignToken(ComposeBearerToken(kSmallTokenGroups).Compose(), MakeSelfSigned(spec));
  WriteFile(directory + "/changed.xml", changed);
  WriteFile(directory + "/foreign.xml", foreign);
}

bool CanValidate(const Sample& sample, bool checksChain) {
  return checksChain || !sample.needsChain;
}

/// What is wrong with the peer's verdicts; empty: nothing.
std::string FindFault(PeerProcess& peer, bool checksChain, const std::string& directory) {
  for (std::size_t i = 0; i < GetSamples().size(); ++i) {
    const Sample& sample = GetSamples()[i];
    const std::string expected =
        std::string("accepted ") + kTokenSubject + " " + std::to_string(sample.token.groups);
    if (CanValidate(sample, checksChain)) {
      const std::string verdict = peer.Check(i, directory + "/" + sample.fileName + ".xml");
      if (verdict != expected) {
        return "says '" + verdict + "' of the token '" + sample.fileName + "'";
      }
    }
  }
  for (const char* const bad : {"changed", "foreign"}) {
    const std::string verdict = peer.Check(0, directory + "/" + bad + ".xml");
    if (verdict.compare(0, 8, "refused ") != 0) {
      return "says '" + verdict + "' of a token that is " + bad;
    }
  }
  return "";
}

/// The time of one validation of each token together, out of a batch of them.
double RunBatches(PeerProcess& peer, bool checksChain, std::vector<std::size_t>& calls) {
  double sum = 0;
  for (std::size_t i = 0; i < GetSamples().size(); ++i) {
    if (CanValidate(GetSamples()[i], checksChain)) {
      const double each = peer.Time(i, calls[i]);
      // On some machines another process's clock stands still now and then: a batch must not become minutes.
      if (each >= kLeastMicroseconds) {
        calls[i] = static_cast<std::size_t>(std::max(1.0, kBatchMicroseconds / each));
      }
      // In proportion: the longest token must not hide the others.
      sum += each / static_cast<double>(GetSamples()[i].token.text.size());
    }
  }
  return sum;
}

void WarmUp(PeerProcess& peer, bool checksChain) {
  std::vector<std::size_t> calls(GetSamples().size(), 1);
  double best = RunBatches(peer, checksChain, calls);
  std::size_t restful = 0;
  for (std::size_t i = 0; i < kMaxBatches && restful < kRestfulBatches; ++i) {
    const double sum = RunBatches(peer, checksChain, calls);
    restful = sum < best * kImprovement ? 0 : restful + 1;
    best = std::min(best, sum);
  }
}

/// bench/peers/CMakeLists.txt says what is in the list.
std::vector<std::vector<std::string>> ReadList() {
  std::ifstream file(QUORLIN_BENCH_PEER_LIST);
  std::vector<std::vector<std::string>> list;
  for (std::string line; std::getline(file, line);) {
    boost::algorithm::split(list.emplace_back(), line, boost::algorithm::is_any_of("\t"));
  }
  if (!file.eof()) {
    throw std::runtime_error(std::string("cannot read ") + QUORLIN_BENCH_PEER_LIST);
  }
  return list;
}

}  // namespace

PeerSet::PeerSet(const std::string& directory) {
  std::vector<std::string> arguments = {Quorlin::kAttrGroupIdentity};
  for (const Sample& sample : GetSamples()) {
    const std::string path = directory + "/" + sample.fileName;
    WriteToken(path, sample.token);
    arguments.push_back(path + ".xml");
    arguments.push_back(path + ".pem");
  }
  WriteToken(directory + "/huge", GetSampleTokens().huge);
  WriteBadTokens(directory);
  for (const std::vector<std::string>& fields : ReadList()) {
    if (fields.at(0) == "present") {
      Start(fields, arguments, directory);
    } else {
      _absent.push_back(fields.at(1) + " is absent (Debian package " + fields.at(2) + ").");
    }
  }
}

void PeerSet::Start(const std::vector<std::string>& fields, const std::vector<std::string>& arguments,
                    const std::string& directory) {
  std::vector<std::string> command(fields.begin() + 4, fields.end());
  command.insert(command.end(), arguments.begin(), arguments.end());
  Peer peer{nullptr, fields.at(2) == "native", fields.at(3) == "chain"};
  std::string fault;
  try {
    peer.process = std::make_shared<PeerProcess>(command);
    fault = FindFault(*peer.process, peer.checksChain, directory);
    if (fault.empty()) {
      WarmUp(*peer.process, peer.checksChain);
    }
  } catch (const std::exception& e) {
    fault = std::string("fails: ") + e.what();
  }
  if (fault.empty()) {
    _peers.push_back(peer);
  } else {
    _absent.push_back(fields.at(1) + " is not measured: it " + fault + ".");
  }
}

std::vector<Contender> PeerSet::GetContenders(const SampleToken& token) const {
  std::vector<Contender> contenders;
  for (std::size_t i = 0; i < GetSamples().size(); ++i) {
    const Sample& sample = GetSamples()[i];
    for (const Peer& peer : _peers) {
      if (&sample.token == &token && CanValidate(sample, peer.checksChain)) {
        contenders.push_back(
            {peer.process->GetName(),
             [i, process = peer.process](std::size_t calls) { return process->Time(i, calls); },
             peer.isNative ? kLeastRatioOfNativePeers : 0, peer.isNative && peer.checksChain});
      }
    }
  }
  return contenders;
}

}  // namespace Bench
