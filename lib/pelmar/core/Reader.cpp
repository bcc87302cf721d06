// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Reader.h>

#include <algorithm>
#include <utility>

namespace Pelmar {

Reader::~Reader() = default;

namespace {

class StringReaderImpl final : public Reader {
 public:
  explicit StringReaderImpl(std::string text) : _text(std::move(text)) {}

  std::size_t Read(char* buffer, std::size_t size) override {
    const std::size_t count = std::min(size, _text.size() - _position);
    std::copy_n(_text.data() + _position, count, buffer);
    _position += count;
    return count;
  }

 private:
  const std::string _text;
  std::size_t _position = 0;
};

}  // namespace

Ref<Reader> CreateStringReader(std::string text) {
  return MakeRef<StringReaderImpl>(std::move(text));
}

}  // namespace Pelmar
