// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/PlainCurl.h"

#include <stdexcept>

namespace Bench {

namespace {

void Require(bool holds, const char* what) {
  if (!holds) {
    throw std::runtime_error(what);
  }
}

template <typename T>
void Set(const EasyHandle& handle, CURLoption option, T value) {
  Require(curl_easy_setopt(handle.get(), option, value) == CURLE_OK, "libcurl refuses a setting");
}

std::size_t TakeBody(char* data, std::size_t size, std::size_t count, void* body) {
  static_cast<std::string*>(body)->append(data, size * count);
  return size * count;
}

}  // namespace

std::shared_ptr<CurlSetup> MakeCurlSetup(const std::string& url, const std::string& anchor,
                                         const Quorlin::Request& request, bool resumes) {
  const auto setup = std::make_shared<CurlSetup>();
  setup->url = url;
  setup->anchor = anchor;
  setup->request = request;
  curl_slist* headers = nullptr;
  const std::string action = "SOAPAction: \"" + request.soapAction + "\"";
  for (const char* const line :
       {"Content-Type: text/xml", "Accept-Encoding: identity", "Accept:", "Expect:", action.c_str()}) {
    headers = curl_slist_append(headers, line);
  }
  setup->headers.reset(headers);
  if (resumes) {
    setup->share.reset(curl_share_init(), curl_share_cleanup);
    curl_share_setopt(setup->share.get(), CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
  }
  return setup;
}

EasyHandle MakeHandle(const CurlSetup& setup) {
  EasyHandle handle(curl_easy_init());
  curl_blob anchor = {const_cast<char*>(setup.anchor.data()), setup.anchor.size(), CURL_BLOB_NOCOPY};
  Set(handle, CURLOPT_NOSIGNAL, 1L);
  Set(handle, CURLOPT_URL, setup.url.c_str());
  Set(handle, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  Set(handle, CURLOPT_CAINFO_BLOB, &anchor);
  Set(handle, CURLOPT_CAPATH, static_cast<char*>(nullptr));
  Set(handle, CURLOPT_SHARE, setup.share.get());
  Set(handle, CURLOPT_HTTPHEADER, setup.headers.get());
  Set(handle, CURLOPT_POSTFIELDSIZE, static_cast<long>(setup.request.body.size()));
  Set(handle, CURLOPT_POSTFIELDS, setup.request.body.c_str());
  Set(handle, CURLOPT_COOKIEFILE, "");
  Set(handle, CURLOPT_WRITEFUNCTION, TakeBody);
  return handle;
}

void PerformAndCompare(const EasyHandle& handle, const std::string& answer) {
  std::string body;
  Set(handle, CURLOPT_WRITEDATA, &body);
  Require(curl_easy_perform(handle.get()) == CURLE_OK && body == answer, "libcurl's exchange failed");
}

}  // namespace Bench
