// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Cookies after an exchange, as the HTTP engine tells them: whatever the lines look like, the store stays
// within its bound and holds no cookie twice.

#include "pelmar/http/CookieStoreImpl.h"

#include <pelmar/Ref.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <set>
#include <string>
#include <vector>

namespace {

using Lines = std::vector<std::string>;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

Lines Split(const std::string& text, char end) {
  Lines parts(1);
  for (const char c : text) {
    if (c == end) {
      parts.emplace_back();
    } else {
      parts.back() += c;
    }
  }
  return parts;
}

/// Domain, path and name of a line in the Netscape form.
Lines IdentityOf(const std::string& line) {
  const std::string mark = "#HttpOnly_";
  Lines fields = Split(line, '\t');
  fields.resize(std::max<std::size_t>(fields.size(), 6));
  std::string domain =
      fields[0].compare(0, mark.size(), mark) == 0 ? fields[0].substr(mark.size()) : fields[0];
  return {domain.substr(!domain.empty() && domain[0] == '.' ? 1 : 0), fields[2], fields[5]};
}

void RequireSound(const Lines& lines) {
  Require(lines.size() <= Pelmar::Http::kMaxCookies);
  std::set<Lines> seen;
  for (const std::string& line : lines) {
    Require(seen.insert(IdentityOf(line)).second);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const Pelmar::Ref<Pelmar::Http::CookieStoreImpl> store = Pelmar::MakeRef<Pelmar::Http::CookieStoreImpl>();
  // One exchange after the other; a line feed ends a cookie, a NUL an exchange.
  for (const std::string& exchange : Split(std::string(data, data + size), '\0')) {
    const Lines before = store->GetLines();
    store->Merge(before, Split(exchange, '\n'));
    RequireSound(store->GetLines());
  }
  return 0;
}
