// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/HttpCalls.h"

#include <pelmar/http/HttpException.h>

#include <typeinfo>

namespace TestSupport {

using Pelmar::Ref;
using namespace Pelmar::Http;

namespace {

std::string GetClassName(const Pelmar::Exception& error) {
  if (typeid(error) == typeid(HttpTimeoutException)) {
    return "HttpTimeoutException";
  }
  return typeid(error) == typeid(HttpException) ? "HttpException" : typeid(error).name();
}

void IgnoreCompletion(const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {}

}  // namespace

Ref<UserAgent> MakeAgent(const Ref<ConnectionSpec>& spec) {
  return CreateHttpUserAgent(spec, CreateCookieStore(""), nullptr);
}

Ref<UserAgent> MakeAgent(int port) {
  return MakeAgent(CreateTCPConnectionSpec("127.0.0.1", port));
}

Ref<ClientRequest> MakeGet(const std::string& path) {
  return CreateHttpRequest(METHOD_GET, path);
}

Ref<ClientRequest> MakePost(const std::string& path, const std::string& body) {
  const Ref<ClientRequest> request = CreateHttpRequest(METHOD_POST, path);
  request->GetBodyWriter()->Write(body.data(), body.size());
  return request;
}

std::string ReadAll(Pelmar::Reader& reader) {
  std::string text;
  char buffer[4096];
  while (const std::size_t size = reader.Read(buffer, sizeof buffer)) {
    text.append(buffer, size);
  }
  return text;
}

std::string Describe(ClientResponse& response) {
  return std::to_string(response.GetStatusCode()) + " " + response.GetReason() + "|" + ReadAll(response);
}

std::string DescribeFailure(const Pelmar::Exception& error) {
  return GetClassName(error) + ": " + error.what();
}

std::string Call(UserAgent& agent, const Ref<ClientRequest>& request, long long timeoutMicroseconds) {
  Ref<PendingRequestItem> item;
  agent.SendAsync(request, IgnoreCompletion, item);
  return Await(agent, item, timeoutMicroseconds);
}

std::string Await(UserAgent& agent, const Ref<PendingRequestItem>& item, long long timeoutMicroseconds) {
  try {
    Ref<ClientResponse> response;
    agent.WaitFor(item, timeoutMicroseconds, response);
    return Describe(*response);
  } catch (const Pelmar::Exception& error) {
    return DescribeFailure(error);
  }
}

CompletionFunctor Completions::GetFunctor() {
  return [this](const Pelmar::Exception* error, ClientResponse* response, PendingRequestItem* item) {
    if ((error == nullptr) == (response == nullptr) || item == nullptr || !item->Wait(0)) {
      Add("a completion that breaks its contract");
    } else {
      Add(error == nullptr ? Describe(*response) : DescribeFailure(*error));
    }
  };
}

std::vector<std::string> Completions::AwaitOutcomes(std::size_t count) {
  std::unique_lock<std::mutex> lock(_mutex);
  _added.wait(lock, [&] { return _outcomes.size() >= count; });
  return _outcomes;
}

std::vector<std::thread::id> Completions::GetThreads() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _threads;
}

void Completions::Add(const std::string& outcome) {
  const std::lock_guard<std::mutex> lock(_mutex);
  _outcomes.push_back(outcome);
  _threads.push_back(std::this_thread::get_id());
  _added.notify_all();
}

}  // namespace TestSupport
