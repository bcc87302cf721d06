// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The head of an HTTP answer: whatever comes, the verdict is one of the known ones and stays; what is passed
// on is fit for a message; and of where the body ends there is one opinion.

#include "pelmar/http/ResponseHead.h"

#include <pelmar/http/Client.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Http;

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

std::vector<std::string> SplitLines(const std::string& text) {
  std::vector<std::string> lines;
  for (std::size_t start = 0; start < text.size();) {
    const std::size_t end = std::min(text.find('\n', start), text.size() - 1) + 1;
    lines.push_back(text.substr(start, end - start));
    start = end;
  }
  return lines;
}

void RequireSoundFacts(const ResponseHead& head) {
  Require(head.GetStatusCode() == 0 || (head.GetStatusCode() >= 100 && head.GetStatusCode() <= 999));
  Require(std::none_of(head.GetReason().begin(), head.GetReason().end(),
                       [](char c) { return (c >= '\0' && c < ' ') || c == '\x7f'; }));
  Require(!head.IsComplete() || (head.HasStarted() && head.GetStatusCode() >= 200));
  Require(!head.IsEndedByConnection() || head.IsComplete());
}

/// In lower case, and without the blanks around it.
std::string NameOf(const std::string& line) {
  std::string name = line.substr(0, line.find(':'));
  std::transform(name.begin(), name.end(), name.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + ('a' - 'A')) : c; });
  const std::size_t start = name.find_first_not_of(" \t\r\n");
  return start == std::string::npos ? "" : name.substr(start, name.find_last_not_of(" \t\r\n") + 1 - start);
}

/// Only what was accepted is looked at: how many of the lines of the final response say how long its body is,
/// as the most forgiving of readers would see it.
void RequireOneLength(const std::vector<std::string>& lines, const ResponseHead& head) {
  const auto count = std::count_if(lines.begin(), lines.end(), [](const std::string& line) {
    return NameOf(line) == "content-length" || NameOf(line) == "transfer-encoding";
  });
  Require(count <= 1);
  const int status = head.GetStatusCode();
  Require(!head.IsComplete() || status == 204 || status == 304 || (count == 0) == head.IsEndedByConnection());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::vector<std::string> lines = SplitLines(std::string(data, data + size));
  ResponseHead head;
  std::vector<std::string> finalLines;
  std::size_t bytes = 0;
  for (const std::string& line : lines) {
    const HeadFault before = head.GetFault();
    const bool isHead = !head.IsComplete();
    const HeadFault fault = head.TakeLine(line.data(), line.size());
    bytes += line.size();
    Require(fault == head.GetFault() && (before == HeadFault::NONE || fault == before));
    Require(fault != HeadFault::NONE || bytes <= kMaxResponseHeaderBytes);
    RequireSoundFacts(head);
    if (isHead && head.GetStatusCode() >= 200) {
      finalLines.push_back(line);
    }
  }
  if (head.GetFault() == HeadFault::NONE) {
    RequireOneLength(finalLines, head);
  }
  return 0;
}
