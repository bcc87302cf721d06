// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The application object, its log manager, and named loggers with levels that are bit flags.

#ifndef PELMAR_SERVICE_LOGGER_H
#define PELMAR_SERVICE_LOGGER_H

#include <pelmar/Export.h>
#include <pelmar/MessageFormatter.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/system/DateTime.h>

#include <string>

namespace Pelmar {
namespace Service {

/// Levels, worst first. Each is one bit, so a set of levels is a mask.
enum LogLevel {
  LOG_PANIC = 1,
  LOG_CRITICAL = 2,
  LOG_ERROR = 4,
  LOG_WARNING = 8,
  LOG_NOTICE = 16,
  LOG_STATUS = 32,
  LOG_INFO = 64
};

enum : int {
  kAllLogLevels = 127,    ///< All seven levels.
  kDefaultLogLevels = 15  ///< Warnings and worse: what is enabled until the host says otherwise.
};

/// One line on its way to a sink. Name and text are raw: they may hold whatever came from outside, line feeds
/// and terminal control included, so a sink that writes lines escapes them as its medium demands.
struct LogRecord {
  std::string logger;
  int level;
  System::DateTime time;
  std::string text;
};

/// Where log lines go. A host derives its own. `Write` may be called from several threads at once and must
/// not throw: the line of one that does is lost.
class PELMAR_API LogSink : public Object {
 public:
  virtual void Write(const LogRecord& record) = 0;

 protected:
  ~LogSink() override;
};

/// A named source of log lines. Safe to use from any thread.
class PELMAR_API Logger : public Object {
 public:
  virtual const std::string& GetName() const = 0;
  /// Whether a line of this level would be written. One atomic load: ask before building costly arguments.
  virtual bool IsEnabled(int level) const = 0;
  /// Hands the line to the sink if its level is enabled.
  virtual void Write(int level, const std::string& text) = 0;

 protected:
  ~Logger() override;
};

/// Owns the loggers and the sink. Safe to use from any thread.
class PELMAR_API LogManager {
 public:
  /// Stores the logger called `name` into `logger`, creating it when needed. `levels` is the mask of levels
  /// that the logger may ever write (127: all of them); it counts for the first caller only.
  virtual void GetLogger(const std::string& name, int levels, Ref<Logger>& logger) = 0;
  /// The levels that are written from now on, for every logger: a mask of `LogLevel` bits.
  virtual void SetEnabledLevels(int levels) = 0;
  virtual int GetEnabledLevels() const = 0;
  /// Where lines go from now on. Null restores the default, which writes each as "<time> <LEVEL> <logger>:
  /// <text>" to standard error, with control characters escaped. A line that another thread is writing may
  /// still reach the old sink after the call; the old sink lives until that is done.
  virtual void SetSink(const Ref<LogSink>& sink) = 0;

 protected:
  ~LogManager() {}
};

/// The process as the platform sees it.
class PELMAR_API Application {
 public:
  virtual LogManager* GetLogManager() = 0;

 protected:
  ~Application() {}
};

/// The process's application object. Never null, and never destroyed, so that exiting threads may still log;
/// a sink that the host installed lives as long, unless the host puts another in its place.
PELMAR_API Application* GetApp();

/// Writes a line if the logger has the level enabled; the format's placeholders %1 and %2 are only filled
/// then.
PELMAR_API void LogInternal(Logger* logger, int level, const char* format);
PELMAR_API void LogInternal(Logger* logger, int level, const char* format, const PrintFormatter& first);
PELMAR_API void LogInternal(Logger* logger, int level, const char* format, const PrintFormatter& first,
                            const PrintFormatter& second);

}  // namespace Service
}  // namespace Pelmar

#endif  // PELMAR_SERVICE_LOGGER_H
