// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owners of libcurl's objects.

#ifndef PELMAR_HTTP_CURLHANDLES_H
#define PELMAR_HTTP_CURLHANDLES_H

#include <curl/curl.h>

#include <memory>

namespace Pelmar {
namespace Http {

template <auto Free>
struct CurlDeleter {
  template <typename T>
  void operator()(T* handle) const noexcept {
    Free(handle);
  }
};

using EasyHandle = std::unique_ptr<CURL, CurlDeleter<curl_easy_cleanup>>;
using MultiHandle = std::unique_ptr<CURLM, CurlDeleter<curl_multi_cleanup>>;
using ShareHandle = std::unique_ptr<CURLSH, CurlDeleter<curl_share_cleanup>>;
using TextList = std::unique_ptr<curl_slist, CurlDeleter<curl_slist_free_all>>;

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CURLHANDLES_H
