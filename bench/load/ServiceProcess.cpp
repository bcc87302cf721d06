// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/load/ServiceProcess.h"

#include "devsts/Service.h"

#include <pelmar/crypto/Certificate.h>
#include <pelmar/ssl/SSLContext.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <memory>
#include <stdexcept>
#include <system_error>

#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bench {

namespace {

/// What the helper is told: kill the service, if there is one, and start another if `port` is not negative.
struct Order {
  std::int32_t port;
  std::uint32_t delayMs;
};

/// True when all bytes came; false at the end of the channel.
bool ReceiveAll(int channel, void* data, std::size_t size) {
  const ssize_t count = recv(channel, data, size, MSG_WAITALL);
  return count == static_cast<ssize_t>(size);
}

void SendAll(int channel, const void* data, std::size_t size) {
  if (send(channel, data, size, MSG_NOSIGNAL) != static_cast<ssize_t>(size)) {
    throw std::system_error(errno, std::generic_category(), "cannot reach the helper process");
  }
}

std::uint16_t GetPort(const std::string& url) {
  return static_cast<std::uint16_t>(std::stoi(url.substr(url.rfind(':') + 1)));
}

/// Runs until it is killed. Tells the port, or 0 when it cannot serve.
[[noreturn]] void Serve(int channel, const DevSts::ServiceConfig& config) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  std::unique_ptr<DevSts::Service> service;
  std::uint16_t port = 0;
  try {
    service = std::make_unique<DevSts::Service>(config);
    port = GetPort(service->GetUrl());
  } catch (const std::exception& e) {
    std::fprintf(stderr, "the service cannot be started: %s\n", e.what());
  }
  SendAll(channel, &port, sizeof(port));
  for (;;) {
    pause();
  }
}

void KillService(pid_t service) {
  if (service > 0) {
    kill(service, SIGKILL);
    waitpid(service, nullptr, 0);
  }
}

/// The helper's life: obeys until its parent has gone.
[[noreturn]] void Help(int channel, const DevSts::Identity& server, const DevSts::Identity& signer) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  pid_t service = -1;
  Order order = {};
  while (ReceiveAll(channel, &order, sizeof(order))) {
    KillService(service);
    service = -1;
    if (order.port >= 0) {
      DevSts::ServiceConfig config;
      config.port = static_cast<std::uint16_t>(order.port);
      config.delay = std::chrono::milliseconds(order.delayMs);
      config.server = server;
      config.signer = signer;
      service = fork();
      if (service == 0) {
        Serve(channel, config);
      }
    } else {
      const std::uint16_t none = 0;
      SendAll(channel, &none, sizeof(none));
    }
  }
  KillService(service);
  _exit(0);
}

}  // namespace

ServiceProcess::ServiceProcess()
    : _server(_authority.IssueServer({"127.0.0.1"})), _signer(_authority.IssueSigner()) {
  std::array<int, 2> ends = {};
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    throw std::system_error(errno, std::generic_category(), "socketpair");
  }
  _helper = fork();
  if (_helper == 0) {
    close(ends[0]);
    Help(ends[1], _server, _signer);
  }
  close(ends[1]);
  _channel = ends[0];
  if (_helper < 0) {
    close(_channel);
    throw std::system_error(errno, std::generic_category(), "fork");
  }
}

ServiceProcess::~ServiceProcess() {
  // Not by the end of the channel: another child of this process may hold its other end, too.
  kill(_helper, SIGKILL);
  waitpid(_helper, nullptr, 0);
  close(_channel);
}

void ServiceProcess::Start(unsigned delayMs) {
  const Order order = {_port, delayMs};
  SendAll(_channel, &order, sizeof(order));
  std::uint16_t port = 0;
  if (!ReceiveAll(_channel, &port, sizeof(port)) || port == 0) {
    throw std::runtime_error("the service could not be started");
  }
  _port = port;
}

void ServiceProcess::Kill() {
  const Order order = {-1, 0};
  SendAll(_channel, &order, sizeof(order));
  std::uint16_t none = 0;
  if (!ReceiveAll(_channel, &none, sizeof(none))) {
    throw std::runtime_error("the helper process has gone");
  }
}

Quorlin::SecurityTokenServiceConfig ServiceProcess::MakeClientConfig() const {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(_authority.GetCertificate());
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = "https://127.0.0.1:" + std::to_string(_port) + DevSts::kServicePath;
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(_signer.certificate);
  return config;
}

}  // namespace Bench
