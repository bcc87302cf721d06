// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A TLS server in a process of its own, so that its work is not counted as its clients'.

#ifndef QUORLIN_BENCH_HTTPSPEER_H
#define QUORLIN_BENCH_HTTPSPEER_H

#include "support/Pki.h"

#include <sys/types.h>

#include <string>

namespace Bench {

/// Serves HTTPS on a port of 127.0.0.1 from construction to destruction: every request, whatever it asks for,
/// is answered with status 200 and the same body. Construct it before there is a second thread, for it forks.
class HttpsPeer final {
 public:
  enum Resumption { RESUMES, NEVER_RESUMES };

  /// Throws std::runtime_error.
  HttpsPeer(const TestSupport::Identity& identity, const std::string& body, Resumption resumption);
  HttpsPeer(const HttpsPeer&) = delete;
  HttpsPeer& operator=(const HttpsPeer&) = delete;
  ~HttpsPeer();

  int GetPort() const { return _port; }

 private:
  int _port = 0;
  pid_t _process = -1;
};

}  // namespace Bench

#endif  // QUORLIN_BENCH_HTTPSPEER_H
