// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Writer.h>

#include <pelmar/SecretText.h>

#include <algorithm>
#include <utility>

namespace Pelmar {

Writer::~Writer() = default;

StringWriter::~StringWriter() = default;

namespace {

class StringWriterImpl final : public StringWriter {
 public:
  void Write(const char* data, std::size_t size) override { _text.append(data, size); }
  const std::string& GetText() const override { return _text; }

 private:
  std::string _text;
};

/// Grows by itself, since a string would leave what it has outgrown as it is.
class SecretStringWriterImpl final : public StringWriter {
 public:
  void Write(const char* data, std::size_t size) override {
    if (size > _text.capacity() - _text.size()) {
      Grow(size);
    }
    _text.append(data, size);
  }
  const std::string& GetText() const override { return _text; }

 private:
  ~SecretStringWriterImpl() override { Wipe(_text); }

  void Grow(std::size_t size) {
    std::string larger;
    larger.reserve(std::max(_text.size() + size, 2 * _text.capacity()));
    larger.append(_text);
    Wipe(_text);
    _text = std::move(larger);
  }

  std::string _text;
};

}  // namespace

Ref<StringWriter> CreateStringWriter() {
  return MakeRef<StringWriterImpl>();
}

Ref<StringWriter> CreateSecretStringWriter() {
  return MakeRef<SecretStringWriterImpl>();
}

}  // namespace Pelmar
