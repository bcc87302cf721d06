// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Counts the operations of the process, and shows the numbers to a Prometheus server, in its text format
// 0.0.4, at http://127.0.0.1:PORT/metrics. The port is a free one; the address is the first line of standard
// output.
//
//   metricsEndpoint URL CA.pem STS.pem
//
// Each line of standard input is a user name, a blank and the password of somebody who wants a token. Ends
// with the input.

#include <quorlin/quorlin.h>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <fstream>
#include <iostream>
#include <iterator>
#include <map>
#include <mutex>
#include <stdexcept>
#include <string>
#include <system_error>
#include <thread>
#include <utility>

namespace {

/// Counts and sums by operation and outcome. Both are closed lists, so the number of series is bounded.
class Counters final : public Quorlin::OperationMetrics {
 public:
  /// Called by several threads at once.
  void OperationEnded(const Quorlin::OperationReport& report) override {
    const std::lock_guard<std::mutex> lock(_mutex);
    Series& series = _series[Key(report.operation, Quorlin::GetOutcomeName(report.outcome))];
    ++series.count;
    series.microseconds += report.durationMicroseconds;
    series.retries += report.attempts - 1;
  }

  std::string Print() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    std::string text =
        "# HELP quorlin_operation_duration_seconds Time that token service operations took.\n"
        "# TYPE quorlin_operation_duration_seconds summary\n";
    for (const std::pair<const Key, Series>& entry : _series) {
      const std::string labels = PrintLabels(entry.first);
      text += "quorlin_operation_duration_seconds_sum" + labels + PrintSeconds(entry.second.microseconds) +
              "quorlin_operation_duration_seconds_count" + labels + std::to_string(entry.second.count) + "\n";
    }
    text +=
        "# HELP quorlin_operation_retries_total Requests that were tried again.\n"
        "# TYPE quorlin_operation_retries_total counter\n";
    for (const std::pair<const Key, Series>& entry : _series) {
      text += "quorlin_operation_retries_total" + PrintLabels(entry.first) +
              std::to_string(entry.second.retries) + "\n";
    }
    return text;
  }

 private:
  typedef std::pair<std::string, std::string> Key;

  struct Series {
    long long count = 0;
    long long microseconds = 0;
    long long retries = 0;
  };

  static std::string PrintLabels(const Key& key) {
    return "{operation=\"" + key.first + "\",outcome=\"" + key.second + "\"} ";
  }

  static std::string PrintSeconds(long long microseconds) {
    const std::string fraction = std::to_string(1000000 + microseconds % 1000000).substr(1);
    return std::to_string(microseconds / 1000000) + "." + fraction + "\n";
  }

  mutable std::mutex _mutex;
  std::map<Key, Series> _series;
};

/// Owns a socket.
class Socket {
 public:
  explicit Socket(int descriptor) : _descriptor(descriptor) {
    if (descriptor < 0) {
      throw std::system_error(errno, std::generic_category(), "socket");
    }
  }
  ~Socket() { ::close(_descriptor); }
  Socket(const Socket&) = delete;
  Socket& operator=(const Socket&) = delete;

  int Get() const { return _descriptor; }

 private:
  const int _descriptor;
};

/// Answers GET /metrics, one client after the other, until it is destroyed. Only for this machine, and no
/// more of HTTP than a scraper needs; a real host has a server already, and adds a path to it.
class Endpoint {
 public:
  explicit Endpoint(const boost::shared_ptr<const Counters>& counters)
      : _counters(counters),
        _listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)),
        _port(Listen(_listener)) {
    _thread = std::thread([this] { Run(); });
  }
  ~Endpoint() {
    // Wakes the thread that waits for a client.
    ::shutdown(_listener.Get(), SHUT_RDWR);
    _thread.join();
  }
  Endpoint(const Endpoint&) = delete;
  Endpoint& operator=(const Endpoint&) = delete;

  int GetPort() const { return _port; }

 private:
  static int Listen(const Socket& listener) {
    sockaddr_in address = sockaddr_in();
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof(address);
    sockaddr* const generic = reinterpret_cast<sockaddr*>(&address);
    if (::bind(listener.Get(), generic, size) != 0 || ::listen(listener.Get(), SOMAXCONN) != 0 ||
        ::getsockname(listener.Get(), generic, &size) != 0) {
      throw std::system_error(errno, std::generic_category(), "listen");
    }
    return ntohs(address.sin_port);
  }

  void Run() {
    for (;;) {
      const int client = ::accept4(_listener.Get(), nullptr, nullptr, SOCK_CLOEXEC);
      if (client < 0) {
        return;
      }
      try {
        const Socket owner(client);
        Send(client, Answer(ReadHead(client)));
      } catch (const std::exception&) {
        // This client gets no answer.
      }
    }
  }

  /// The request up to the empty line, or what there is of it.
  static std::string ReadHead(int client) {
    const std::size_t kMaxHeadBytes = 8192;
    const timeval patience = {1, 0};
    ::setsockopt(client, SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof(patience));
    std::string head;
    while (head.size() < kMaxHeadBytes && head.find("\r\n\r\n") == std::string::npos) {
      char block[1024];
      const ssize_t size = ::recv(client, block, sizeof(block), 0);
      if (size <= 0) {
        break;
      }
      head.append(block, static_cast<std::size_t>(size));
    }
    return head;
  }

  std::string Answer(const std::string& head) const {
    if (head.compare(0, 13, "GET /metrics ") != 0) {
      return "HTTP/1.1 404 Not Found\r\nContent-Length: 0\r\nConnection: close\r\n\r\n";
    }
    const std::string body = _counters->Print();
    return "HTTP/1.1 200 OK\r\nContent-Type: text/plain; version=0.0.4; charset=utf-8\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body;
  }

  static void Send(int client, const std::string& text) {
    for (std::size_t sent = 0; sent < text.size();) {
      const ssize_t size = ::send(client, text.data() + sent, text.size() - sent, MSG_NOSIGNAL);
      if (size <= 0) {
        return;
      }
      sent += static_cast<std::size_t>(size);
    }
  }

  const boost::shared_ptr<const Counters> _counters;
  const Socket _listener;
  const int _port;
  std::thread _thread;
};

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

boost::shared_ptr<Quorlin::SecurityTokenService> MakeService(char** arguments) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.caFile = arguments[2];
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = arguments[1];
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(arguments[3]));
  return Quorlin::CreateSecurityTokenService(config);
}

void AcquireTokens(const Quorlin::SecurityTokenService& service) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  std::string user;
  std::string password;
  while (std::cin >> user && std::getline(std::cin >> std::ws, password)) {
    try {
      std::cout << service.AcquireToken(user, password, spec)->GetSubject().ToString() << std::endl;
    } catch (const Quorlin::SsoException& error) {
      std::cout << "no token: " << error.what() << std::endl;
    }
  }
}

void Run(char** arguments) {
  const boost::shared_ptr<Quorlin::SecurityTokenService> service = MakeService(arguments);
  const boost::shared_ptr<Counters> counters(new Counters);
  Quorlin::InstallOperationMetrics(counters);
  const Endpoint endpoint(counters);
  std::cout << "http://127.0.0.1:" << endpoint.GetPort() << "/metrics" << std::endl;
  AcquireTokens(*service);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::cerr << "usage: metricsEndpoint URL CA.pem STS.pem < users\n";
    return 2;
  }
  try {
    Run(argv);
    return 0;
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
  }
}
