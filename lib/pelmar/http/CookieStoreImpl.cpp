// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/CookieStoreImpl.h"

#include <pelmar/Exception.h>

#include <algorithm>

namespace Pelmar {
namespace Http {

namespace {

using Lines = std::vector<std::string>;

constexpr std::size_t kPathField = 2;
constexpr std::size_t kNameField = 5;

bool Contains(const Lines& lines, const std::string& line) {
  return std::find(lines.begin(), lines.end(), line) != lines.end();
}

std::string GetField(const std::string& line, std::size_t index) {
  std::size_t start = 0;
  for (; index > 0; --index) {
    const std::size_t tab = line.find('\t', start);
    if (tab == std::string::npos) {
      return std::string();
    }
    start = tab + 1;
  }
  return line.substr(start, line.find('\t', start) - start);
}

// The domain field carries a mark and a leading dot that are attributes, not part of the domain.
std::string GetDomain(const std::string& line) {
  static const std::string kHttpOnlyMark = "#HttpOnly_";
  std::string domain = GetField(line, 0);
  if (domain.compare(0, kHttpOnlyMark.size(), kHttpOnlyMark) == 0) {
    domain.erase(0, kHttpOnlyMark.size());
  }
  return !domain.empty() && domain[0] == '.' ? domain.substr(1) : domain;
}

/// Two cookies of the same name, domain and path are the same cookie (RFC 6265, section 5.3, step 11).
bool IsSameCookie(const std::string& a, const std::string& b) {
  return GetField(a, kNameField) == GetField(b, kNameField) &&
         GetField(a, kPathField) == GetField(b, kPathField) && GetDomain(a) == GetDomain(b);
}

/// A new value leaves a cookie as old as it was (RFC 6265, section 5.3, step 11.3).
void Put(Lines& lines, const std::string& line) {
  const auto same = std::find_if(lines.begin(), lines.end(),
                                 [&](const std::string& other) { return IsSameCookie(line, other); });
  if (same == lines.end()) {
    lines.push_back(line);
  } else {
    *same = line;
  }
}

/// Whether it is among them, perhaps with another value.
bool HasCookie(const Lines& lines, const std::string& line) {
  return std::any_of(lines.begin(), lines.end(),
                     [&](const std::string& other) { return IsSameCookie(line, other); });
}

}  // namespace

CookieStore::~CookieStore() = default;

CookieStoreImpl::~CookieStoreImpl() = default;

void CookieStoreImpl::Merge(const Lines& before, const Lines& after) {
  const auto isRemoved = [&](const std::string& line) {
    return HasCookie(before, line) && !HasCookie(after, line);
  };
  _lines.erase(std::remove_if(_lines.begin(), _lines.end(), isRemoved), _lines.end());
  for (const std::string& line : after) {
    if (!Contains(before, line)) {
      Put(_lines, line);
    }
  }
  if (_lines.size() > kMaxCookies) {
    _lines.erase(_lines.begin(), _lines.end() - static_cast<std::ptrdiff_t>(kMaxCookies));
  }
}

Ref<CookieStore> CreateCookieStore(const std::string& fileName) {
  if (!fileName.empty()) {
    throw InvalidArgumentException("cookies are kept in memory only, so the file name must be empty");
  }
  return MakeRef<CookieStoreImpl>();
}

}  // namespace Http
}  // namespace Pelmar
