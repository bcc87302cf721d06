// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pin.h"

#include "pelmar/crypto/HostFunction.h"

#include <openssl/crypto.h>

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>

namespace Pelmar {
namespace Crypto {

namespace {

[[noreturn]] void ThrowFileError(const std::string& path, const std::string& reason) {
  throw CryptoException("The PIN file '" + path + "' cannot be used: " + reason);
}

/// A file that is open for reading.
class OpenFile final {
 public:
  explicit OpenFile(const std::string& path)
      : _path(path), _descriptor(open(path.c_str(), O_RDONLY | O_CLOEXEC)) {
    if (_descriptor < 0) {
      ThrowFileError(path, std::strerror(errno));
    }
  }
  OpenFile(const OpenFile&) = delete;
  OpenFile& operator=(const OpenFile&) = delete;
  ~OpenFile() { close(_descriptor); }

  /// 0 at the end.
  std::size_t Read(char* buffer, std::size_t size) const {
    for (;;) {
      const ssize_t count = read(_descriptor, buffer, size);
      if (count >= 0) {
        return static_cast<std::size_t>(count);
      }
      if (errno != EINTR) {
        ThrowFileError(_path, std::strerror(errno));
      }
    }
  }

 private:
  std::string _path;
  int _descriptor;
};

/// The longest PIN, its line end, and one byte by which a file is too long.
struct PinBuffer {
  ~PinBuffer() { OPENSSL_cleanse(bytes.data(), bytes.size()); }

  std::array<char, kMaxPinBytes + 3> bytes;
};

std::string ReadPin(const std::string& path) {
  const OpenFile file(path);
  PinBuffer buffer;
  std::size_t size = 0;
  while (const std::size_t count = file.Read(buffer.bytes.data() + size, buffer.bytes.size() - size)) {
    size += count;
  }
  if (size == buffer.bytes.size()) {
    ThrowFileError(path, "it is too long");
  }
  if (size > 0 && buffer.bytes[size - 1] == '\n') {
    --size;
    size -= size > 0 && buffer.bytes[size - 1] == '\r' ? 1 : 0;
  }
  return std::string(buffer.bytes.data(), size);
}

}  // namespace

PinFunction ReadPinFrom(const std::string& path) {
  return [path] {
    return ReadPin(path);
  };
}

Pin::Pin(const PinFunction& askPin) : _pin([&askPin] { return CallHost("The PIN cannot be had", askPin); }) {
  if (_pin.text.empty() || _pin.text.size() > kMaxPinBytes || _pin.text.find('\0') != std::string::npos) {
    throw CryptoException("The PIN is empty, has more than " + std::to_string(kMaxPinBytes) +
                          " bytes, or holds a zero byte");
  }
}

}  // namespace Crypto
}  // namespace Pelmar
