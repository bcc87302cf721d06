// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/SecretText.h>

#include <string.h>

#include <utility>

namespace Pelmar {

// The C library's own fills memory as fast as any memset, which counts where every request passes.
void Wipe(void* data, std::size_t size) noexcept {
  if (size > 0) {
    explicit_bzero(data, size);
  }
}

void Wipe(std::string& text) noexcept {
  // What stands between the end and the capacity may be the rest of a longer text. No growth, so no throw.
  text.resize(text.capacity());
  Wipe(&text[0], text.size());
  text.clear();
}

void Wipe(std::vector<unsigned char>& bytes) noexcept {
  bytes.resize(bytes.capacity());
  Wipe(bytes.data(), bytes.size());
  bytes.clear();
}

SecretText::SecretText() = default;

SecretText::SecretText(const std::string& text) : _text(text) {}

SecretText::SecretText(std::string&& text) : _text(std::move(text)) {
  // A short text stands in the string object itself, and is copied from there.
  Wipe(text);
}

SecretText::SecretText(const SecretText& other) = default;

SecretText::SecretText(SecretText&& other) noexcept : _text(std::move(other._text)) {
  Wipe(other._text);
}

SecretText& SecretText::operator=(const SecretText& other) {
  if (this != &other) {
    *this = SecretText(other);
  }
  return *this;
}

SecretText& SecretText::operator=(SecretText&& other) noexcept {
  if (this != &other) {
    // Emptied first, so that the memory which is given away, or kept, has nothing in it.
    Wipe(_text);
    _text = std::move(other._text);
    Wipe(other._text);
  }
  return *this;
}

SecretText::~SecretText() {
  Wipe(_text);
}

}  // namespace Pelmar
