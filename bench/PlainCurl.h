// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// libcurl alone, sending what the library sends.

#ifndef QUORLIN_BENCH_PLAINCURL_H
#define QUORLIN_BENCH_PLAINCURL_H

#include "quorlin/Request.h"

#include <curl/curl.h>

#include <memory>
#include <string>

namespace Bench {

struct CurlDeleter {
  void operator()(CURL* handle) const noexcept { curl_easy_cleanup(handle); }
  void operator()(curl_slist* list) const noexcept { curl_slist_free_all(list); }
};

using EasyHandle = std::unique_ptr<CURL, CurlDeleter>;

/// What handles are made with. Lives longer than they. One thread at a time may use its handles.
struct CurlSetup {
  std::string url;
  std::string anchor;  ///< The CA's certificate as PEM text.
  Quorlin::Request request;
  std::unique_ptr<curl_slist, CurlDeleter> headers;
  std::shared_ptr<CURLSH> share;
};

/// `resumes`: its handles share TLS sessions.
std::shared_ptr<CurlSetup> MakeCurlSetup(const std::string& url, const std::string& anchor,
                                         const Quorlin::Request& request, bool resumes);

EasyHandle MakeHandle(const CurlSetup& setup);

/// One request and its answer. Throws std::runtime_error when the body is not `answer`.
void PerformAndCompare(const EasyHandle& handle, const std::string& answer);

}  // namespace Bench

#endif  // QUORLIN_BENCH_PLAINCURL_H
