// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Writer.h>

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

}  // namespace

Ref<StringWriter> CreateStringWriter() {
  return MakeRef<StringWriterImpl>();
}

}  // namespace Pelmar
