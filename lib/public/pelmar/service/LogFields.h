// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Named values beside the text of a log line, for programs that read it: the second form of a sink.

#ifndef PELMAR_SERVICE_LOGFIELDS_H
#define PELMAR_SERVICE_LOGFIELDS_H

#include <pelmar/Export.h>
#include <pelmar/service/Logger.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Service {

/// One named value. Names are ASCII letters, digits and '_'; each occurs once in a line. Values are raw, as
/// the text of a line is.
struct LogField {
  std::string name;
  std::string value;
};

typedef std::vector<LogField> LogFields;

/// Knows what the lines that a thread writes now belong to.
class PELMAR_API LogFieldSource {
 public:
  /// Appends the fields of a line that is written at this moment. Called on the thread that writes the line,
  /// and only if the sink wants fields. Should it throw, the line is lost.
  virtual void AddFields(LogFields& fields) const = 0;

 protected:
  /// Not virtual: a source is never owned by a LogContext.
  ~LogFieldSource() {}
};

/// As long as it lives, the lines that this thread writes, by whatever logger, have the fields of `source`.
/// Of nested contexts the innermost counts alone. It begins and ends on one thread, nested like the scopes of
/// that thread, so it must not be kept while a coroutine is suspended. Takes no lock.
class PELMAR_API LogContext {
 public:
  /// Keeps a pointer to `source`, which has to live longer.
  explicit LogContext(const LogFieldSource& source) noexcept;
  ~LogContext();

 private:
  LogContext(const LogContext&) = delete;
  LogContext& operator=(const LogContext&) = delete;

  const LogFieldSource* const _outer;
};

/// A sink that is told the fields too. A host derives its own and installs it by LogManager::SetSink; the
/// rules of LogSink hold.
class PELMAR_API FieldLogSink : public LogSink {
 public:
  /// `fields` is empty for a line that is written outside every LogContext.
  virtual void WriteWithFields(const LogRecord& record, const LogFields& fields) = 0;

  /// Calls WriteWithFields with the fields of this thread.
  void Write(const LogRecord& record) final;

 protected:
  ~FieldLogSink() override;
};

}  // namespace Service
}  // namespace Pelmar

#endif  // PELMAR_SERVICE_LOGFIELDS_H
