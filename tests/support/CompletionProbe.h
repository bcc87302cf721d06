// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Watches the completion function of an asynchronous operation.

#ifndef QUORLIN_TESTS_SUPPORT_COMPLETIONPROBE_H
#define QUORLIN_TESTS_SUPPORT_COMPLETIONPROBE_H

#include <pelmar/Exception.h>

#include <boost/function.hpp>

#include <future>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace TestSupport {

/// One call of a completion function.
template <typename Value>
struct CompletionCall {
  Value value;
  std::shared_ptr<const Pelmar::Exception> error;  ///< A clone; null when there was none.
  std::thread::id thread;

  std::string Message() const { return error ? error->what() : "no error"; }
};

/// Hands out one completion function and waits until it can never be called again, so that "once" is really
/// told from "twice".
template <typename Value>
class CompletionProbe {
 public:
  using Function = boost::function<void(const Value&, const Pelmar::Exception*)>;
  using Calls = std::vector<CompletionCall<Value>>;

  CompletionProbe() : _record(std::make_shared<Record>()), _released(_record->released.get_future()) {}

  /// To be called once. `afterwards`, if given, runs at the end of each call of the function.
  Function GetFunction(const boost::function<void()>& afterwards = boost::function<void()>()) {
    const std::shared_ptr<LastCopy> lastCopy = std::make_shared<LastCopy>(_record);
    return [lastCopy, afterwards](const Value& value, const Pelmar::Exception* error) {
      lastCopy->record->Add(value, error);
      if (afterwards) {
        afterwards();
      }
    };
  }

  /// Waits until the function and all its copies are gone; all calls there were.
  Calls Wait() {
    _released.wait();
    const std::lock_guard<std::mutex> lock(_record->mutex);
    return _record->calls;
  }

 private:
  struct Record {
    void Add(const Value& value, const Pelmar::Exception* error) {
      const std::lock_guard<std::mutex> lock(mutex);
      calls.push_back({value,
                       std::shared_ptr<const Pelmar::Exception>(error == nullptr ? nullptr : error->Clone()),
                       std::this_thread::get_id()});
    }

    std::mutex mutex;
    Calls calls;
    std::promise<void> released;
  };

  struct LastCopy {
    explicit LastCopy(const std::shared_ptr<Record>& watched) : record(watched) {}
    ~LastCopy() { record->released.set_value(); }
    const std::shared_ptr<Record> record;
  };

  const std::shared_ptr<Record> _record;
  std::future<void> _released;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_COMPLETIONPROBE_H
