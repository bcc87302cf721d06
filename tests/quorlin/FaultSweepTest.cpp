// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A whole exchange with one fault in it, at every byte in both directions: the right token or an exception of
// ours, never another token, a hang, a crash or a descriptor that stays open.

#include "quorlin/HttpsClient.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/ResponseHandlerImpl.h"
#include "quorlin/SecurityTokenServiceImpl.h"
#include "support/FaultProxy.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/ServiceAnswers.h"
#include "support/TokenMeaning.h"

#include <pelmar/ssl/SSLContext.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <sched.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <iterator>
#include <list>
#include <memory>
#include <mutex>
#include <ostream>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
/// Under a sanitizer only every so many-th byte is hit.
constexpr std::size_t kStep = 41;
constexpr std::size_t kTlsStep = 97;
#else
constexpr std::size_t kStep = 1;
/// Cuts and flipped bits hit every byte; in TLS, whose records hide what is in them, the others hit every
/// third.
constexpr std::size_t kTlsStep = 3;
#endif

/// Most of the time each waits for the others.
constexpr std::size_t kThreads = 8;

/// A changed length makes one side wait for bytes that never come, until the client gives up.
constexpr long long kShortTimeout = 500 * 1000;
/// For faults that leave nothing out; never passes in a test that works.
constexpr long long kLongTimeout = 600LL * 1000 * 1000;

std::size_t CountDescriptors() {
  const std::filesystem::directory_iterator all("/proc/self/fd");
  return static_cast<std::size_t>(std::distance(begin(all), end(all)));
}

/// The HTTP loop closes connections shortly after their calls have returned. Waits until they are closed; the
/// test runner ends a test in which one stays open.
void AwaitDescriptors(std::size_t count) {
  while (CountDescriptors() > count) {
    sched_yield();
  }
}

class Exchange final {
 public:
  explicit Exchange(bool isTls) {
    const LoopbackServer::Script script =
        AnswerEach({HttpAnswer("200 OK", IssueAnswer(SignedToken("valid")), "Connection: close\r\n")});
    if (!isTls) {
      _server = std::make_unique<LoopbackServer>(std::vector<LoopbackServer::Script>{script});
      return;
    }
    CertificateSpec spec;
    spec.keyKind = KeyKind::EC_P256;
    spec.subjectAlternativeName = "IP:127.0.0.1";
    const Identity identity = MakeSelfSigned(spec);
    _server = std::make_unique<LoopbackServer>(TlsServerSettings(identity),
                                               std::vector<LoopbackServer::Script>{script});
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Trust({identity});
    _context = Pelmar::Ssl::CreateSSLContext(options);
  }

  /// What the token means, or "" when an exception of ours tells that there is none. Counts what either side
  /// sent.
  std::string Acquire(const FaultPlan& plan, long long timeout, std::size_t* sizes = nullptr) {
    FaultProxy proxy(_server->GetPort(), plan);
    const std::string url =
        (_context ? "https://127.0.0.1:" : "http://127.0.0.1:") + std::to_string(proxy.GetPort()) + "/";
    const SecurityTokenServiceImpl service(boost::make_shared<RequestBuilderImpl>(boost::none),
                                           boost::make_shared<HttpsClient>(url, _context.Get(), "", timeout),
                                           boost::make_shared<ResponseHandlerImpl>(), _trusted);
    TokenSpec spec;
    spec.tokenLifetimeSec = 300;
    std::string text;
    try {
      text = MeaningOf(*service.AcquireToken("alice", "pass-word", spec));
    } catch (const Pelmar::Exception&) {
      text.clear();
    }
    if (sizes != nullptr) {
      sizes[0] = proxy.CountFromClient();
      sizes[1] = proxy.CountFromServer();
    }
    return text;
  }

 private:
  const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> _trusted = TrustedSigner();
  std::unique_ptr<LoopbackServer> _server;
  Pelmar::Ref<Pelmar::Ssl::SSLContext> _context;
};

/// All runs with one kind of fault, several at a time.
class Sweep final {
 public:
  Sweep(Exchange& exchange, Fault fault, std::size_t step, long long timeout)
      : _exchange(exchange),
        _fault(fault),
        _step(step),
        _timeout(timeout),
        _right(exchange.Acquire(FaultPlan(), kLongTimeout, _sizes)) {
    EXPECT_FALSE(_right.empty());
  }

  void Run() {
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < kThreads; ++i) {
      threads.emplace_back([this] { Work(); });
    }
    for (std::thread& thread : threads) {
      thread.join();
    }
  }

  std::size_t CountRight() const { return _rightOnes; }
  std::size_t CountRefused() const { return _refused; }
  const std::vector<std::string>& GetWrong() const { return _wrong; }

 private:
  void Work() {
    // A little beyond the end, as sizes of TLS messages vary; and so far that a step falls there.
    const std::size_t slack = 8 + _step;
    const std::size_t towardsServer = _sizes[0] + slack;
    for (std::size_t i = _next++ * _step; i < towardsServer + _sizes[1] + slack; i = _next++ * _step) {
      Check(i < towardsServer ? FaultPlan{_fault, false, i} : FaultPlan{_fault, true, i - towardsServer});
    }
  }

  void Check(const FaultPlan& plan) {
    const std::string text = _exchange.Acquire(plan, _timeout);
    if (text.empty()) {
      ++_refused;
    } else if (text == _right) {
      ++_rightOnes;
    } else {
      const std::lock_guard<std::mutex> lock(_mutex);
      _wrong.push_back((plan.isTowardsClient ? "towards the client, byte " : "towards the server, byte ") +
                       std::to_string(plan.offset) + ": " + text);
    }
  }

  Exchange& _exchange;
  const Fault _fault;
  const std::size_t _step;
  const long long _timeout;
  std::size_t _sizes[2] = {};
  const std::string _right;
  std::atomic<std::size_t> _next{0};
  std::atomic<std::size_t> _rightOnes{0};
  std::atomic<std::size_t> _refused{0};
  std::mutex _mutex;
  std::vector<std::string> _wrong;
};

struct FaultCase {
  const char* name;
  Fault fault;
  bool isHarmless;
  bool hitsEachByte;  ///< In TLS too.
};

/// For gtest, which would print the bytes, those between the members too.
void PrintTo(const FaultCase& fault, std::ostream* stream) {
  *stream << fault.name;
}

class FaultSweep : public testing::TestWithParam<std::tuple<FaultCase, bool>> {};

INSTANTIATE_TEST_SUITE_P(Of, FaultSweep,
                         testing::Combine(testing::Values(FaultCase{"Cuts", Fault::CUT, false, true},
                                                          FaultCase{"Resets", Fault::RESET, false, false},
                                                          FaultCase{"FlippedBits", Fault::FLIP, false, true},
                                                          FaultCase{"DuplicatedBytes", Fault::DUPLICATE,
                                                                    false, false},
                                                          FaultCase{"Delays", Fault::HOLD, true, false}),
                                          testing::Bool()),
                         [](const auto& parameter) {
                           return std::string(std::get<0>(parameter.param).name) +
                                  (std::get<1>(parameter.param) ? "InTls" : "InPlainHttp");
                         });

TEST_P(FaultSweep, EndsInTheRightTokenOrAnException) {
  const FaultCase fault = std::get<0>(GetParam());
  const bool isTls = std::get<1>(GetParam());
  Exchange exchange(isTls);
  exchange.Acquire(FaultPlan(), kLongTimeout);  // Starts the threads, which keep descriptors of their own.
  const std::size_t descriptors = CountDescriptors();
  Sweep sweep(exchange, fault.fault, isTls && !fault.hitsEachByte ? kTlsStep : kStep,
              fault.isHarmless ? kLongTimeout : kShortTimeout);
  sweep.Run();
  EXPECT_EQ(sweep.GetWrong(), std::vector<std::string>());
  EXPECT_GT(sweep.CountRight(), 0u);  // Beyond the end, at least.
  EXPECT_EQ(sweep.CountRefused() > 0, !fault.isHarmless);
  RecordProperty("right", std::to_string(sweep.CountRight()));
  RecordProperty("refused", std::to_string(sweep.CountRefused()));
  AwaitDescriptors(descriptors);
}

TEST(FaultOfSingleBytes, EndsInTheRightToken) {
  for (const bool isTls : {false, true}) {
    Exchange exchange(isTls);
    const std::string right = exchange.Acquire(FaultPlan(), kLongTimeout);
    ASSERT_FALSE(right.empty());
    EXPECT_EQ(exchange.Acquire({Fault::SINGLE_BYTES, false, 0}, kLongTimeout), right);
    EXPECT_EQ(exchange.Acquire({Fault::SINGLE_BYTES, true, 0}, kLongTimeout), right);
  }
}

}  // namespace
}  // namespace Quorlin
