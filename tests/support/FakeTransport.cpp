// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/FakeTransport.h"

#include <boost/make_shared.hpp>

#include <stdexcept>

namespace TestSupport {

namespace {

struct PlannedAnswer {
  std::string body;
  std::shared_ptr<const Pelmar::Exception> error;
};

}  // namespace

struct FakeTransport::State {
  std::mutex mutex;
  std::deque<PlannedAnswer> answers;
  std::function<void()> beforeAnswer;
  std::vector<std::string> sent;
  int createdSessions = 0;
  int livingSessions = 0;
};

namespace {

class FakeSession final : public Quorlin::TransportSession {
 public:
  explicit FakeSession(const std::shared_ptr<FakeTransport::State>& state) : _state(state) {
    const std::lock_guard<std::mutex> lock(_state->mutex);
    _number = ++_state->createdSessions;
    ++_state->livingSessions;
  }

  ~FakeSession() {
    const std::lock_guard<std::mutex> lock(_state->mutex);
    --_state->livingSessions;
  }

  void SendRequest(const Quorlin::Request& request, Pelmar::Ref<Pelmar::Reader>& response) override {
    const std::function<void()> beforeAnswer = Record(request);
    if (beforeAnswer) {
      beforeAnswer();
    }
    const PlannedAnswer answer = TakeAnswer();
    if (answer.error) {
      answer.error->Throw();
    }
    response = Pelmar::CreateStringReader(answer.body);
  }

  void SendRequestAsync(const Quorlin::Request&, const Quorlin::ResponseCallback&,
                        Pelmar::Ref<Pelmar::System::ScheduledItem>&) override {
    throw std::logic_error("the fake transport is used synchronously only");
  }

 private:
  std::function<void()> Record(const Quorlin::Request& request) {
    const std::lock_guard<std::mutex> lock(_state->mutex);
    _state->sent.push_back(std::to_string(_number) + "|" + request.soapAction + "|" + request.body);
    return _state->beforeAnswer;
  }

  PlannedAnswer TakeAnswer() {
    const std::lock_guard<std::mutex> lock(_state->mutex);
    if (_state->answers.empty()) {
      throw std::logic_error("the fake transport was sent a request that no answer is planned for");
    }
    const PlannedAnswer answer = _state->answers.front();
    _state->answers.pop_front();
    return answer;
  }

  const std::shared_ptr<FakeTransport::State> _state;
  int _number;
};

}  // namespace

FakeTransport::FakeTransport() : _state(std::make_shared<State>()) {}

void FakeTransport::Answer(const std::string& body) {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  _state->answers.push_back({body, nullptr});
}

void FakeTransport::Fail(const Pelmar::Exception& error) {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  _state->answers.push_back({std::string(), std::shared_ptr<const Pelmar::Exception>(error.Clone())});
}

void FakeTransport::SetBeforeAnswer(const std::function<void()>& action) {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  _state->beforeAnswer = action;
}

boost::shared_ptr<Quorlin::TransportSession> FakeTransport::CreateSession() const {
  return boost::make_shared<FakeSession>(_state);
}

std::vector<std::string> FakeTransport::GetSent() const {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  return _state->sent;
}

int FakeTransport::GetCreatedSessions() const {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  return _state->createdSessions;
}

int FakeTransport::GetLivingSessions() const {
  const std::lock_guard<std::mutex> lock(_state->mutex);
  return _state->livingSessions;
}

}  // namespace TestSupport
