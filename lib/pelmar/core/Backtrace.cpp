// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/core/Backtrace.h"

#include "pelmar/core/Demangle.h"

#include <dlfcn.h>
#include <execinfo.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <exception>
#include <iterator>
#include <sstream>

namespace Pelmar {

namespace {

// What lies below the caller of CaptureBacktrace: itself, and one frame more where a sanitizer wraps
// backtrace().
constexpr std::size_t kMaxOwnFrames = 4;

// A return address belongs to the instruction after the call, which may already be another function's first.
const void* GetCallAddress(void* returnAddress) {
  return static_cast<const char*>(returnAddress) - 1;
}

std::string ToHex(std::uintptr_t value) {
  std::ostringstream text;
  text << "0x" << std::hex << value;
  return text.str();
}

std::string GetFileName(const std::string& path) {
  return path.substr(path.rfind('/') + 1);
}

std::string GetFunction(void* returnAddress) {
  Dl_info info = {};
  const bool named = dladdr(GetCallAddress(returnAddress), &info) != 0 && info.dli_sname != nullptr;
  return named ? Demangle(info.dli_sname) : std::string();
}

bool EndsWith(const std::string& text, const std::string& end) {
  return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

// Not inlined: the return address of this very function is what tells own frames from the caller's.
__attribute__((noinline)) std::vector<void*> CaptureBacktrace() noexcept {
  std::array<void*, kMaxBacktraceFrames + kMaxOwnFrames> frames = {};
  const int count = backtrace(frames.data(), static_cast<int>(frames.size()));
  const auto end = frames.begin() + count;
  const auto first = std::find(frames.begin(), end, __builtin_return_address(0));
  const auto kept = std::min<std::ptrdiff_t>(end - first, kMaxBacktraceFrames);
  try {
    return std::vector<void*>(first, first + kept);
  } catch (const std::exception&) {
    return {};
  }
}

std::string DescribeFrame(void* returnAddress) {
  Dl_info info = {};
  if (dladdr(GetCallAddress(returnAddress), &info) == 0 || info.dli_fname == nullptr) {
    return ToHex(reinterpret_cast<std::uintptr_t>(returnAddress));
  }
  const auto offset =
      reinterpret_cast<std::uintptr_t>(returnAddress) - reinterpret_cast<std::uintptr_t>(info.dli_fbase);
  const std::string place = GetFileName(info.dli_fname) + "+" + ToHex(offset);
  return info.dli_sname == nullptr ? place : Demangle(info.dli_sname) + " (" + place + ")";
}

bool IsExceptionConstructor(const std::string& function) {
  const std::string qualifiedName = function.substr(0, function.find('('));
  const std::size_t lastSeparator = qualifiedName.rfind("::");
  if (lastSeparator == std::string::npos) {
    return false;
  }
  const std::string name = qualifiedName.substr(lastSeparator + 2);
  const std::string scope = qualifiedName.substr(0, lastSeparator);
  const bool isConstructor = scope == name || EndsWith(scope, "::" + name);
  return isConstructor && (name == "Throwable" || EndsWith(name, "Exception"));
}

std::string DescribeRaisingFrame(const std::vector<void*>& backtrace) {
  const auto raising = std::find_if(backtrace.begin(), backtrace.end(), [](void* returnAddress) {
    return !IsExceptionConstructor(GetFunction(returnAddress));
  });
  if (raising != backtrace.end()) {
    return DescribeFrame(*raising);
  }
  return backtrace.empty() ? std::string() : DescribeFrame(backtrace.front());
}

}  // namespace Pelmar
