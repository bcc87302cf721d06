// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Messages with numbered placeholders, and the printing of typed values into them.

#ifndef PELMAR_MESSAGEFORMATTER_H
#define PELMAR_MESSAGEFORMATTER_H

#include <pelmar/Export.h>

#include <string>
#include <vector>

namespace Pelmar {

namespace System {
class DateTime;
}

/// Prints one value. A formatter borrows its value and is used at once; it is only asked when the message is
/// really needed.
class PELMAR_API PrintFormatter {
 public:
  virtual std::string Print() const = 0;

 protected:
  ~PrintFormatter() {}
};

/// Prints a `T` by its `ToString`; a null pointer prints "(null)".
template <typename T>
class ToStringFormatter final : public PrintFormatter {
 public:
  explicit ToStringFormatter(const T* value) : _value(value) {}
  std::string Print() const override {
    return _value == nullptr ? std::string("(null)") : _value->ToString();
  }

 private:
  const T* _value;
};

/// Prints a string as it is.
class PELMAR_API StringFormatter final : public PrintFormatter {
 public:
  explicit StringFormatter(const std::string& value) : _value(value) {}
  std::string Print() const override;

 private:
  const std::string& _value;
};

/// Prints an integer in decimal.
class PELMAR_API IntegerFormatter final : public PrintFormatter {
 public:
  explicit IntegerFormatter(long long value) : _value(value) {}
  std::string Print() const override;

 private:
  long long _value;
};

/// Prints "true" or "false".
class PELMAR_API BooleanFormatter final : public PrintFormatter {
 public:
  explicit BooleanFormatter(bool value) : _value(value) {}
  std::string Print() const override;

 private:
  bool _value;
};

/// Fills the placeholders %1 to %9 of a format.
///
/// The format is read once, from front to back: what an argument prints is never searched for placeholders
/// again. A placeholder without an argument stays as it stands, as does any other "%".
class PELMAR_API MessageFormatter {
 public:
  explicit MessageFormatter(const std::string& format);

  /// Supplies the next argument: %1 first, then %2, and so on.
  MessageFormatter& Add(const PrintFormatter& value);
  MessageFormatter& AddString(const std::string& value);
  MessageFormatter& AddInteger(long long value);
  MessageFormatter& AddBoolean(bool value);
  MessageFormatter& AddDate(const System::DateTime& value);

  std::string ToString() const;

 private:
  std::string _format;
  std::vector<std::string> _values;
};

}  // namespace Pelmar

#endif  // PELMAR_MESSAGEFORMATTER_H
