// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/MessageFormatter.h>

#include <pelmar/system/DateTime.h>

#include <cstddef>

namespace Pelmar {

std::string StringFormatter::Print() const {
  return _value;
}

std::string IntegerFormatter::Print() const {
  return std::to_string(_value);
}

std::string BooleanFormatter::Print() const {
  return _value ? "true" : "false";
}

MessageFormatter::MessageFormatter(const std::string& format) : _format(format) {}

MessageFormatter& MessageFormatter::Add(const PrintFormatter& value) {
  return AddString(value.Print());
}

MessageFormatter& MessageFormatter::AddString(const std::string& value) {
  _values.push_back(value);
  return *this;
}

MessageFormatter& MessageFormatter::AddInteger(long long value) {
  return Add(IntegerFormatter(value));
}

MessageFormatter& MessageFormatter::AddBoolean(bool value) {
  return Add(BooleanFormatter(value));
}

MessageFormatter& MessageFormatter::AddDate(const System::DateTime& value) {
  return Add(ToStringFormatter<System::DateTime>(&value));
}

std::string MessageFormatter::ToString() const {
  std::string text;
  std::size_t copied = 0;
  for (std::size_t i = 0; i + 1 < _format.size(); ++i) {
    const char digit = _format[i + 1];
    if (_format[i] != '%' || digit < '1' || digit > '9') {
      continue;
    }
    const std::size_t index = static_cast<std::size_t>(digit - '1');
    if (index < _values.size()) {
      text.append(_format, copied, i - copied).append(_values[index]);
      copied = i + 2;
      ++i;
    }
  }
  return text.append(_format, copied, std::string::npos);
}

}  // namespace Pelmar
