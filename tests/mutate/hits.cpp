// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Linked into a test program whose sources hold mutants: switches on the one that QUORLIN_MUTANT names and,
// when QUORLIN_MUTANT_HITS names a file, writes there for each test how long it took and which mutants it
// reached.

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <fstream>
#include <ios>
#include <string>

namespace {

constexpr std::size_t kMaxMutants = 16384;

using Hits = std::atomic<bool>[kMaxMutants];

/// In a file, so that the child processes of death tests, which may be new programs, note theirs in it too.
/// Null when nobody asks.
std::atomic<bool>* MapHits() {
  const char* const path = std::getenv("QUORLIN_MUTANT_HITS");
  if (path == nullptr) {
    return nullptr;
  }
  const int file = open((std::string(path) + ".map").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  if (file < 0 || ftruncate(file, sizeof(Hits)) != 0) {
    std::abort();
  }
  void* const place = mmap(nullptr, sizeof(Hits), PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
  close(file);
  if (place == MAP_FAILED) {
    std::abort();
  }
  return static_cast<std::atomic<bool>*>(place);
}

std::atomic<bool>* GetHits() {
  static std::atomic<bool>* const hits = MapHits();
  return hits;
}

int ReadNumber() {
  const char* const text = std::getenv("QUORLIN_MUTANT");
  return text == nullptr ? -1 : std::atoi(text);
}

class HitWriter final : public testing::EmptyTestEventListener {
 public:
  explicit HitWriter(const char* path) : _output(path, std::ios::app) {}

 private:
  void OnTestStart(const testing::TestInfo& /*info*/) override {
    for (std::size_t i = 0; i < kMaxMutants; ++i) {
      GetHits()[i] = false;
    }
  }

  void OnTestEnd(const testing::TestInfo& info) override {
    _output << info.test_suite_name() << '.' << info.name() << '\t' << info.result()->elapsed_time() << '\t';
    for (std::size_t i = 0; i < kMaxMutants; ++i) {
      if (GetHits()[i]) {
        _output << ' ' << i;
      }
    }
    _output << '\n' << std::flush;
  }

  std::ofstream _output;
};

const bool isListening = [] {
  if (const char* const path = std::getenv("QUORLIN_MUTANT_HITS")) {
    testing::UnitTest::GetInstance()->listeners().Append(new HitWriter(path));
  }
  return true;
}();

}  // namespace

extern "C" bool QuorlinIsMutant(int number) noexcept {
  static const int chosen = ReadNumber();
  if (std::atomic<bool>* const hits = GetHits()) {
    hits[number].store(true, std::memory_order_relaxed);
  }
  return number == chosen;
}
