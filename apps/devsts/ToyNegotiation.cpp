// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/ToyNegotiation.h"

#include "devsts/Fault.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/crypto/Digest.h>

#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/hmac.h>

#include <algorithm>
#include <stdexcept>
#include <vector>

namespace DevSts {

namespace {

constexpr const char* kClientRole = "client";
constexpr const char* kServiceRole = "service";
constexpr std::size_t kMaxTimeDigits = 12;

std::string MakeGreeting(unsigned legs) {
  return "toy negotiation of " + std::to_string(legs) + " legs";
}

NegotiationLeg ToLeg(const std::string& text) {
  return NegotiationLeg(text.begin(), text.end());
}

std::string ComputeHmac(const std::string& key, const std::string& text) {
  std::vector<unsigned char> value(EVP_MAX_MD_SIZE);
  unsigned size = 0;
  if (HMAC(EVP_sha256(), key.data(), static_cast<int>(key.size()),
           reinterpret_cast<const unsigned char*>(text.data()), text.size(), value.data(),
           &size) == nullptr) {
    throw std::runtime_error("cannot compute an HMAC");
  }
  value.resize(size);
  return Pelmar::Crypto::ToHex(value);
}

/// In a time that does not tell where they differ.
bool IsSame(const std::string& a, const std::string& b) {
  return a.size() == b.size() && CRYPTO_memcmp(a.data(), b.data(), a.size()) == 0;
}

[[noreturn]] void RefuseForm() {
  throw Fault(FaultCode::REQUEST_FAILED, "The leg is none of the toy negotiation");
}

/// The lines of a leg, without their ends. Throws Fault.
std::vector<std::string> ReadLines(const NegotiationLeg& leg) {
  if (leg.empty() || leg.size() > kMaxToyLegBytes || leg.back() != '\n') {
    RefuseForm();
  }
  std::vector<std::string> lines(1);
  for (auto byte = leg.begin(); byte != leg.end() - 1; ++byte) {
    if (*byte == '\n') {
      lines.emplace_back();
    } else {
      lines.back().push_back(static_cast<char>(*byte));
    }
  }
  return lines;
}

long long ReadTime(const std::string& text) {
  const bool isNumber = !text.empty() && text.size() <= kMaxTimeDigits &&
                        text.find_first_not_of("0123456789") == std::string::npos;
  if (!isNumber) {
    RefuseForm();
  }
  return std::stoll(text) * kMicrosecondsPerSecond;
}

}  // namespace

void ToyTranscript::Add(const std::string& leg) {
  // The length keeps two legs from passing for one.
  _text += std::to_string(leg.size()) + ":" + leg;
}

std::string ToyTranscript::Prove(const char* role, const std::string& leg,
                                 const std::string& password) const {
  ToyTranscript whole = *this;
  whole.Add(leg);
  return ComputeHmac(password, role + whole._text);
}

struct ToyService {
  ToyOptions options;
  Directory directory;
  Clock clock;
  ReplayGuard replays;
};

namespace {

/// One client's negotiation on the service's side.
class ToyNegotiation final : public Negotiation {
 public:
  explicit ToyNegotiation(const std::shared_ptr<ToyService>& service) : _service(service) {}

  NegotiationStep Accept(const NegotiationLeg& leg) override {
    std::vector<std::string> lines = ReadLines(leg);
    const bool isLast = ++_received == _service->options.legs;
    RequireLineCount(lines, isLast);
    if (_received == 1) {
      ReadGreeting(lines);
    }
    if (isLast) {
      return Finish(leg, lines.back());
    }
    return Challenge(std::string(leg.begin(), leg.end()));
  }

 private:
  void RequireLineCount(const std::vector<std::string>& lines, bool isLast) const {
    const std::size_t expected = (_received == 1 ? 4U : 1U) + (isLast ? 1U : 0U);
    if (lines.size() != expected) {
      RefuseForm();
    }
  }

  void ReadGreeting(const std::vector<std::string>& lines) {
    if (lines[0] != MakeGreeting(_service->options.legs)) {
      RefuseForm();
    }
    _userName = lines[1];
    _time = ReadTime(lines[2]);
    _nonce = lines[3];
  }

  NegotiationStep Challenge(const std::string& leg) {
    const std::string answer = Pelmar::StringUtil::GenerateUuid() + "\n";
    _transcript.Add(leg);
    _transcript.Add(answer);
    return {ToLeg(answer), std::nullopt};
  }

  NegotiationStep Finish(const NegotiationLeg& leg, const std::string& proof) {
    const User* const user = _service->directory.FindByName(_userName);
    const std::string password = user != nullptr ? user->password : std::string();
    const std::string said(leg.begin(), leg.end() - static_cast<std::ptrdiff_t>(proof.size()) - 1);
    const bool isRight = IsSame(_transcript.Prove(kClientRole, said, password), proof);
    if (!isRight || password.empty()) {
      throw Fault(FaultCode::FAILED_AUTHENTICATION, "Invalid user name or password");
    }
    RequireFirst(user->GetUpn());
    _transcript.Add(std::string(leg.begin(), leg.end()));
    if (!_service->options.provesBack) {
      return {{}, user->GetUpn()};
    }
    return {ToLeg(_transcript.Prove(kServiceRole, "", password) + "\n"), user->GetUpn()};
  }

  /// Only what carried a right proof is remembered, so that nobody else can fill the memory.
  void RequireFirst(const std::string& upn) {
    const long long now = _service->clock();
    if (_time < now - kMaxToyClockSkew || _time > now + kMaxToyClockSkew) {
      throw Fault(FaultCode::FAILED_AUTHENTICATION, "The negotiation was not begun now: check the clocks");
    }
    if (!_service->replays.IsFirst(upn + "\n" + _nonce, _time + kMaxToyClockSkew + 1, now)) {
      throw Fault(FaultCode::FAILED_AUTHENTICATION, "The negotiation was held before");
    }
  }

  std::shared_ptr<ToyService> _service;
  ToyTranscript _transcript;
  unsigned _received = 0;
  std::string _userName;
  long long _time = 0;
  std::string _nonce;
};

}  // namespace

ToyMechanism::ToyMechanism(const ToyOptions& options, const Directory& directory, const Clock& clock)
    : _service(std::shared_ptr<ToyService>(new ToyService{options, directory, clock, {}})) {
  if (options.legs < 1 || options.legs > kMaxToyLegs) {
    throw std::invalid_argument("a toy negotiation has 1 to " + std::to_string(kMaxToyLegs) + " legs");
  }
}

std::unique_ptr<Negotiation> ToyMechanism::Begin() const {
  return std::make_unique<ToyNegotiation>(_service);
}

ToyClient::ToyClient(const ToyOptions& options, const std::string& user, const std::string& password,
                     const Clock& clock)
    : _options(options), _user(user), _password(password), _clock(clock) {}

NegotiationLeg ToyClient::Answer(const NegotiationLeg& serverLeg) {
  const std::string heard(serverLeg.begin(), serverLeg.end());
  if (_isOver || heard.empty() != (_sent == 0)) {
    throw Pelmar::Exception("The service says something that has no place in a toy negotiation");
  }
  if (_sent == _options.legs) {
    return CheckProof(heard);
  }
  if (_sent > 0) {
    _transcript.Add(heard);
  }
  ++_sent;
  std::string leg = MakeLeg();
  if (_sent == _options.legs) {
    leg += _transcript.Prove(kClientRole, leg, _password.Reveal()) + "\n";
  }
  _transcript.Add(leg);
  return ToLeg(leg);
}

std::string ToyClient::MakeLeg() const {
  const std::string nonce = Pelmar::StringUtil::GenerateUuid() + "\n";
  if (_sent > 1) {
    return nonce;
  }
  return MakeGreeting(_options.legs) + "\n" + _user + "\n" +
         std::to_string(_clock() / kMicrosecondsPerSecond) + "\n" + nonce;
}

NegotiationLeg ToyClient::CheckProof(const std::string& serverLeg) {
  _isOver = true;
  if (!IsSame(_transcript.Prove(kServiceRole, "", _password.Reveal()) + "\n", serverLeg)) {
    throw Pelmar::Exception("The service does not prove that it knows the password");
  }
  return ToLeg("done\n");
}

}  // namespace DevSts
