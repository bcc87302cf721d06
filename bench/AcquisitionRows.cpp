// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/AcquisitionRows.h"

#include "bench/HttpsPeer.h"
#include "bench/PlainCurl.h"
#include "bench/Tokens.h"

#include "quorlin/RequestBuilderImpl.h"
#include "support/Pki.h"
#include "support/ServiceAnswers.h"

#include <pelmar/ssl/SSLContext.h>
#include <quorlin/SecurityTokenService.h>

#include <chrono>
#include <exception>
#include <memory>
#include <mutex>
#include <thread>

namespace Bench {

using namespace TestSupport;

namespace {

constexpr double kLimit = 2.5;
constexpr double kResumedAim = 1.15;
constexpr std::size_t kCallsPerSample = 320;
constexpr std::size_t kSamples = 7;
constexpr const char* kUser = "alice@example.com";
constexpr const char* kPassword = "open sesame";

const Identity& GetCa() {
  static const Identity ca = MakeCa("Benchmark CA");
  return ca;
}

const std::string& GetAnswer() {
  static const std::string answer = IssueAnswer(GetSampleTokens().small.text);
  return answer;
}

HttpsPeer StartPeer(HttpsPeer::Resumption resumption) {
  CertificateSpec spec;
  spec.commonName = "localhost";
  spec.extendedKeyUsage = "serverAuth";
  spec.subjectAlternativeName = "IP:127.0.0.1";
  return HttpsPeer(MakeIssued(GetCa(), spec), GetAnswer(), resumption);
}

const HttpsPeer& GetResumingPeer() {
  static const HttpsPeer peer = StartPeer(HttpsPeer::RESUMES);
  return peer;
}

const HttpsPeer& GetForgetfulPeer() {
  static const HttpsPeer peer = StartPeer(HttpsPeer::NEVER_RESUMES);
  return peer;
}

std::string GetUrl(const HttpsPeer& peer) {
  return "https://127.0.0.1:" + std::to_string(peer.GetPort()) + "/sts";
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

Action Acquire(const HttpsPeer& peer) {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Trust({GetCa()});
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = GetUrl(peer);
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates = GetSampleTokens().small.trusted;
  return [service = Quorlin::CreateSecurityTokenService(config), spec = MakeSpec()] {
    service->AcquireToken(kUser, kPassword, spec);
  };
}

// The request is ready, and nothing is read of the answer but the token in it.
Action PerformAndValidate(const HttpsPeer& peer, bool resumes) {
  Quorlin::Request request;
  Quorlin::RequestBuilderImpl(boost::none).BuildUserPassTokenRequest(kUser, kPassword, MakeSpec(), request);
  return [setup = MakeCurlSetup(GetUrl(peer), GetCa().GetCertificatePem(), request, resumes)] {
    PerformAndCompare(MakeHandle(*setup), GetAnswer());
    Quorlin::CreateSamlToken(GetSampleTokens().small.text, GetSampleTokens().small.trusted);
  };
}

Row MakeRow(const std::string& name, const Action& subject, const Action& floor) {
  Row row{name, GetAnswer().size(), subject, floor, kLimit};
  row.countsAllThreads = true;
  return row;
}

// --- Many callers ---

/// Acquisitions in a second, when each of `actions` has a thread of its own. Throws what an action throws.
double CountPerSecond(const std::vector<Action>& actions) {
  using Clock = std::chrono::steady_clock;
  const std::size_t calls = kCallsPerSample / actions.size();
  std::exception_ptr failure;
  std::mutex mutex;
  std::vector<std::thread> threads;
  const Clock::time_point start = Clock::now();
  for (const Action& action : actions) {
    threads.emplace_back([&] {
      try {
        for (std::size_t i = 0; i < calls; ++i) {
          action();
        }
      } catch (...) {
        const std::lock_guard<std::mutex> lock(mutex);
        failure = std::current_exception();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  if (failure) {
    std::rethrow_exception(failure);
  }
  return static_cast<double>(calls * actions.size()) /
         std::chrono::duration<double>(Clock::now() - start).count();
}

CallersResult MeasureCallers(std::size_t callers) {
  const std::vector<Action> ours(callers, Acquire(GetResumingPeer()));
  std::vector<Action> plain;
  for (std::size_t i = 0; i < callers; ++i) {
    plain.push_back(PerformAndValidate(GetResumingPeer(), true));
  }
  std::vector<double> oursPerSecond;
  std::vector<double> plainPerSecond;
  std::vector<double> ratios;
  for (std::size_t i = 0; i < kSamples; ++i) {
    plainPerSecond.push_back(CountPerSecond(plain));
    oursPerSecond.push_back(CountPerSecond(ours));
    ratios.push_back(plainPerSecond.back() / oursPerSecond.back());
  }
  return {callers, Summarise(oursPerSecond), Summarise(plainPerSecond), Summarise(ratios).median};
}

}  // namespace

Section MakeAcquisitionSection() {
  // Before the first request, and so before the library's threads.
  GetResumingPeer();
  GetForgetfulPeer();
  curl_global_init(CURL_GLOBAL_DEFAULT);
  Section section{
      "Acquisitions over HTTPS, against libcurl alone and the validation of the token; processor time of all "
      "threads of the client",
      {MakeRow("full handshake", Acquire(GetForgetfulPeer()), PerformAndValidate(GetForgetfulPeer(), false)),
       MakeRow("resumed handshake", Acquire(GetResumingPeer()),
               PerformAndValidate(GetResumingPeer(), true))}};
  section.rows.back().aim = kResumedAim;
  return section;
}

std::vector<CallersResult> MeasureCallers() {
  std::vector<CallersResult> results;
  for (const std::size_t callers : {1, 4, 16}) {
    results.push_back(MeasureCallers(callers));
  }
  return results;
}

}  // namespace Bench
