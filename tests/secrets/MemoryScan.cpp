// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "secrets/MemoryScan.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <bitset>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace Secrets {

namespace {

using Piece = std::uint64_t;
static_assert(sizeof(Piece) == kPieceBytes);

constexpr Piece kPieceMask = 0x0101010101010101u * kMask;
constexpr std::size_t kContextBytes = 24;

struct Mapping {
  std::uintptr_t begin = 0;
  std::uintptr_t end = 0;
  std::string name;
};

// What was read of the process's memory. It stands in the process's memory itself, and is left out.
std::array<unsigned char, 1 << 20> window;

std::vector<Mapping> ReadWritableMappings() {
  std::ifstream maps("/proc/self/maps");
  std::vector<Mapping> mappings;
  for (std::string line; std::getline(maps, line);) {
    std::istringstream fields(line);
    std::string range, permissions, ignored;
    Mapping mapping;
    fields >> range >> permissions >> ignored >> ignored >> ignored >> mapping.name;
    const std::size_t dash = range.find('-');
    mapping.begin = std::stoull(range.substr(0, dash), nullptr, 16);
    mapping.end = std::stoull(range.substr(dash + 1), nullptr, 16);
    if (permissions.compare(0, 2, "rw") == 0) {
      mappings.push_back(mapping);
    }
  }
  if (mappings.empty()) {
    throw std::runtime_error("/proc/self/maps cannot be read");
  }
  return mappings;
}

Piece LoadPiece(const unsigned char* bytes) {
  Piece piece = 0;
  std::memcpy(&piece, bytes, sizeof(piece));
  return piece;
}

class Scanner final {
 public:
  explicit Scanner(const std::vector<MaskedSecret>& secrets)
      : _memory(open("/proc/self/mem", O_RDONLY | O_CLOEXEC)) {
    if (_memory < 0) {
      throw std::runtime_error("/proc/self/mem cannot be read");
    }
    for (const MaskedSecret& secret : secrets) {
      const std::vector<unsigned char>& masked = secret.GetMasked();
      for (std::size_t i = 0; i + kPieceBytes <= masked.size(); ++i) {
        const Piece piece = LoadPiece(&masked[i]);
        _maskedPieces.push_back(piece);
        _starts.set(piece & 0xFFFF);
      }
    }
    std::sort(_maskedPieces.begin(), _maskedPieces.end());
  }
  Scanner(const Scanner&) = delete;
  Scanner& operator=(const Scanner&) = delete;
  ~Scanner() { close(_memory); }

  void Scan(const Mapping& mapping) {
    const auto ownBegin = reinterpret_cast<std::uintptr_t>(window.data());
    const std::uintptr_t ownEnd = ownBegin + window.size();
    if (ownBegin >= mapping.end || ownEnd <= mapping.begin) {
      ScanRange(mapping, mapping.begin, mapping.end);
      return;
    }
    ScanRange(mapping, mapping.begin, std::max(ownBegin, mapping.begin));
    ScanRange(mapping, std::min(ownEnd, mapping.end), mapping.end);
  }

  const std::vector<std::string>& GetFindings() const { return _findings; }

 private:
  void ScanRange(const Mapping& mapping, std::uintptr_t begin, std::uintptr_t end) {
    while (begin < end) {
      const std::size_t wanted = std::min<std::size_t>(window.size(), end - begin);
      const ssize_t count = pread(_memory, window.data(), wanted, static_cast<off_t>(begin));
      if (count <= 0) {
        return;  // Unmapped meanwhile: nobody's memory any more.
      }
      ScanWindow(mapping, static_cast<std::size_t>(count));
      if (static_cast<std::size_t>(count) < kPieceBytes || begin + static_cast<std::size_t>(count) == end) {
        return;
      }
      begin += static_cast<std::size_t>(count) - (kPieceBytes - 1);
    }
  }

  void ScanWindow(const Mapping& mapping, std::size_t size) {
    for (std::size_t i = 0; i + kPieceBytes <= size; ++i) {
      if (!IsPiece(i)) {
        continue;
      }
      std::size_t end = i + kPieceBytes;
      while (end < size && IsPiece(end + 1 - kPieceBytes)) {
        ++end;
      }
      _findings.push_back(Describe(mapping, i, end, size));
      i = end - 1;
    }
  }

  bool IsPiece(std::size_t position) const {
    const Piece masked = LoadPiece(&window[position]) ^ kPieceMask;
    return _starts.test(masked & 0xFFFF) &&
           std::binary_search(_maskedPieces.begin(), _maskedPieces.end(), masked);
  }

  static std::string Describe(const Mapping& mapping, std::size_t begin, std::size_t end, std::size_t size) {
    std::string text = (mapping.name.empty() ? "[anonymous]" : mapping.name) + " ";
    const std::size_t first = begin - std::min(begin, kContextBytes);
    const std::size_t last = std::min(size, end + kContextBytes);
    for (std::size_t i = first; i < last; ++i) {
      const unsigned char byte = window[i];
      text += i >= begin && i < end ? '#' : byte >= ' ' && byte <= '~' ? static_cast<char>(byte) : '.';
    }
    return text;
  }

  const int _memory;
  std::vector<Piece> _maskedPieces;
  std::bitset<0x10000> _starts;
  std::vector<std::string> _findings;
};

}  // namespace

std::string Mask(const std::string& bytes) {
  std::string digits;
  for (const char byte : bytes) {
    std::array<char, 3> pair;
    std::snprintf(pair.data(), pair.size(), "%02x",
                  static_cast<unsigned>(static_cast<unsigned char>(byte) ^ kMask));
    digits += pair.data();
  }
  return digits;
}

MaskedSecret::MaskedSecret(const std::string& digits) {
  if (digits.size() % 2 != 0 || digits.size() < 2 * kPieceBytes) {
    throw std::invalid_argument("not a masked secret");
  }
  for (std::size_t i = 0; i < digits.size(); i += 2) {
    _masked.push_back(static_cast<unsigned char>(std::stoul(digits.substr(i, 2), nullptr, 16)));
  }
}

void MaskedSecret::Reveal(std::string& text) const {
  text.clear();
  text.reserve(_masked.size());
  for (const unsigned char byte : _masked) {
    text += static_cast<char>(byte ^ kMask);
  }
}

std::vector<std::string> FindInMemory(const std::vector<MaskedSecret>& secrets) {
  Scanner scanner(secrets);
  for (const Mapping& mapping : ReadWritableMappings()) {
    scanner.Scan(mapping);
  }
  return scanner.GetFindings();
}

}  // namespace Secrets
