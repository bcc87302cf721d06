// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// URLs: what is taken apart and put together again is taken apart into the same.

#include <pelmar/http/HttpException.h>
#include <pelmar/http/Url.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

using Pelmar::Http::HttpException;
using Pelmar::Http::HttpURL;
using Pelmar::Http::ParseHttpURL;

std::string Compose(const HttpURL& url) {
  const std::string host = url.host.find(':') == std::string::npos ? url.host : "[" + url.host + "]";
  return std::string(url.isHttps ? "https" : "http") + "://" + host + ":" + std::to_string(url.port) +
         url.path;
}

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  HttpURL url;
  try {
    url = ParseHttpURL(std::string(reinterpret_cast<const char*>(data), size));
  } catch (const HttpException&) {
    return 0;
  }
  Require(!url.host.empty() && url.port >= 1 && url.port <= 65535 && url.path[0] == '/');
  Require((url.host + url.path).find_first_of(std::string("\0\t\r\n #", 6)) == std::string::npos);
  // The default port and the slash that were added may carry the text over the bound.
  if (size + 8 < 8192) {
    const HttpURL again = ParseHttpURL(Compose(url));
    Require(again.isHttps == url.isHttps && again.host == url.host && again.port == url.port &&
            again.path == url.path);
  }
  return 0;
}
