// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Short ways to send requests and to tell what became of them.

#ifndef QUORLIN_TESTS_SUPPORT_HTTPCALLS_H
#define QUORLIN_TESTS_SUPPORT_HTTPCALLS_H

#include <pelmar/Ref.h>
#include <pelmar/http/Client.h>

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace TestSupport {

/// Long enough never to pass in a test that works; the test runner ends one that does not.
constexpr long long kPatience = 600LL * 1000 * 1000;

/// A user agent with a cookie store of its own.
Pelmar::Ref<Pelmar::Http::UserAgent> MakeAgent(const Pelmar::Ref<Pelmar::Http::ConnectionSpec>& spec);
/// ... for plain HTTP to 127.0.0.1.
Pelmar::Ref<Pelmar::Http::UserAgent> MakeAgent(int port);

Pelmar::Ref<Pelmar::Http::ClientRequest> MakeGet(const std::string& path);
Pelmar::Ref<Pelmar::Http::ClientRequest> MakePost(const std::string& path, const std::string& body);

std::string ReadAll(Pelmar::Reader& reader);

/// "200 OK|body".
std::string Describe(Pelmar::Http::ClientResponse& response);
/// "HttpException: message", with the name of the dynamic class.
std::string DescribeFailure(const Pelmar::Exception& error);

/// Sends and waits; the outcome in the words above.
std::string Call(Pelmar::Http::UserAgent& agent, const Pelmar::Ref<Pelmar::Http::ClientRequest>& request,
                 long long timeoutMicroseconds = kPatience);
/// The same for a request that was sent.
std::string Await(Pelmar::Http::UserAgent& agent, const Pelmar::Ref<Pelmar::Http::PendingRequestItem>& item,
                  long long timeoutMicroseconds = kPatience);

/// Takes completions, each in the words above, for as many requests as one likes. Outlives them all.
class Completions final {
 public:
  Pelmar::Http::CompletionFunctor GetFunctor();

  /// Blocks until there are `count`, and gives all there are.
  std::vector<std::string> AwaitOutcomes(std::size_t count);
  std::vector<std::thread::id> GetThreads() const;

 private:
  void Add(const std::string& outcome);

  mutable std::mutex _mutex;
  std::condition_variable _added;
  std::vector<std::string> _outcomes;
  std::vector<std::thread::id> _threads;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_HTTPCALLS_H
