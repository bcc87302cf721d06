// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A program of bench/peers while it runs.

#ifndef QUORLIN_BENCH_PEERPROCESS_H
#define QUORLIN_BENCH_PEERPROCESS_H

#include <cstddef>
#include <string>
#include <vector>

#include <sys/types.h>

namespace Bench {

/// Runs from construction to destruction. Every member function throws std::exception of some kind when the
/// program has ended or answers something else than bench/peers/README.md says.
class PeerProcess final {
 public:
  /// Returns when the program is ready.
  explicit PeerProcess(const std::vector<std::string>& command);
  PeerProcess(const PeerProcess&) = delete;
  PeerProcess& operator=(const PeerProcess&) = delete;

  /// What it calls itself, with the version.
  const std::string& GetName() const { return _name; }
  /// Its verdict on the token in the file `path`, when what is trusted is what belongs to its token number
  /// `token`: "accepted SUBJECT GROUPS" or "refused REASON".
  std::string Check(std::size_t token, const std::string& path);
  /// Lets it validate its token number `token` so many times, and once before, and gives the processor time
  /// that one of them took all its threads, in microseconds.
  double Time(std::size_t token, std::size_t calls);

 private:
  std::string Ask(const std::string& order);
  void Run(std::size_t token, std::size_t calls);
  std::string ReadLine();
  double ReadMicroseconds() const;

  /// The program and our end of its standard input and output. It is killed with its owner.
  class Child final {
   public:
    explicit Child(const std::vector<std::string>& command);
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;
    ~Child();

    pid_t process = -1;
    int channel = -1;
  };

  Child _child;
  std::string _unread;
  std::string _name;
};

}  // namespace Bench

#endif  // QUORLIN_BENCH_PEERPROCESS_H
