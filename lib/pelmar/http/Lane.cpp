// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/Lane.h"

#include "pelmar/http/SpareFailures.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <utility>

namespace Pelmar {
namespace Http {

namespace {

constexpr int kRefuse = -1;
constexpr int kAccept = 0;

}  // namespace

Lane::Lane(Poller& poller, SocketOwners& owners)
    : _poller(poller), _owners(owners), _multi(curl_multi_init()) {
  if (!_multi || curl_multi_setopt(_multi.get(), CURLMOPT_SOCKETFUNCTION, &Lane::OnWatch) != CURLM_OK ||
      curl_multi_setopt(_multi.get(), CURLMOPT_SOCKETDATA, this) != CURLM_OK ||
      curl_multi_setopt(_multi.get(), CURLMOPT_TIMERFUNCTION, &Lane::OnTimer) != CURLM_OK ||
      curl_multi_setopt(_multi.get(), CURLMOPT_TIMERDATA, this) != CURLM_OK) {
    throw HttpException("The HTTP engine cannot be set up");
  }
}

Lane::~Lane() {
  FailAll(GetSpareFailures().processEnds);
  _multi.reset();
  for (auto owner = _owners.begin(); owner != _owners.end();) {
    owner = owner->second == this ? _owners.erase(owner) : std::next(owner);
  }
}

void Lane::Start(const Ref<Exchange>& exchange, const SharedState& shared) {
  auto transfer = std::make_unique<Transfer>(exchange, shared, _sockets);
  CURL* const easy = transfer->GetHandle();
  const auto place = _transfers.emplace(easy, std::move(transfer)).first;
  const CURLMcode code = curl_multi_add_handle(_multi.get(), easy);
  if (code != CURLM_OK) {
    _transfers.erase(place);
    throw HttpException(std::string("The HTTP engine refuses the request: ") + curl_multi_strerror(code));
  }
}

void Lane::Abandon(const Exchange* exchange) {
  const auto transfer = std::find_if(_transfers.begin(), _transfers.end(), [&](const auto& entry) {
    return entry.second->GetExchange().Get() == exchange;
  });
  if (transfer != _transfers.end()) {
    Remove(transfer);
  }
}

void Lane::OnSocket(const SocketEvent& event) {
  Act(event.socket, (event.isReadable ? CURL_CSELECT_IN : 0) | (event.isWritable ? CURL_CSELECT_OUT : 0));
}

void Lane::OnDeadline() {
  _deadline.reset();
  Act(CURL_SOCKET_TIMEOUT, 0);
}

void Lane::Act(curl_socket_t socket, int what) {
  int running = 0;
  const CURLMcode code = curl_multi_socket_action(_multi.get(), socket, what, &running);
  CollectFinished();
  if (code != CURLM_OK) {
    FailAll(GetSpareFailures().engineBrokeDown);
  }
}

void Lane::FailAll(const std::shared_ptr<const HttpException>& failure) {
  while (!_transfers.empty()) {
    const Ref<Exchange> exchange = _transfers.begin()->second->GetExchange();
    Remove(_transfers.begin());
    exchange->Settle(failure, nullptr);
  }
}

void Lane::CollectFinished() {
  int left = 0;
  while (const CURLMsg* const message = curl_multi_info_read(_multi.get(), &left)) {
    if (message->msg == CURLMSG_DONE) {
      Finish(message->easy_handle, message->data.result);
    }
  }
}

void Lane::Finish(CURL* easy, CURLcode code) {
  const auto place = _transfers.find(easy);
  if (place == _transfers.end()) {
    return;
  }
  try {
    place->second->Finish(code);
  } catch (const std::exception&) {
    place->second->GetExchange()->Settle(GetSpareFailures().outOfMemory, nullptr);
  }
  Remove(place);
}

void Lane::Remove(std::map<CURL*, std::unique_ptr<Transfer>>::iterator transfer) {
  curl_multi_remove_handle(_multi.get(), transfer->first);
  _transfers.erase(transfer);
}

int Lane::OnWatch(CURL*, curl_socket_t socket, int what, void* lane, void*) noexcept {
  auto* const self = static_cast<Lane*>(lane);
  if (what == CURL_POLL_REMOVE) {
    self->_poller.Forget(socket);
    self->_owners.erase(socket);
    return kAccept;
  }
  try {
    self->_owners[socket] = self;
  } catch (const std::exception&) {
    return kRefuse;
  }
  const bool forReading = what == CURL_POLL_IN || what == CURL_POLL_INOUT;
  const bool forWriting = what == CURL_POLL_OUT || what == CURL_POLL_INOUT;
  return self->_poller.Watch(socket, forReading, forWriting) ? kAccept : kRefuse;
}

int Lane::OnTimer(CURLM*, long timeoutMilliseconds, void* lane) noexcept {
  auto* const self = static_cast<Lane*>(lane);
  if (timeoutMilliseconds < 0) {
    self->_deadline.reset();
  } else {
    self->_deadline = Clock::now() + std::chrono::milliseconds(timeoutMilliseconds);
  }
  return kAccept;
}

}  // namespace Http
}  // namespace Pelmar
