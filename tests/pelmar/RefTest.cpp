// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Object.h>
#include <pelmar/Ref.h>

#include <gtest/gtest.h>

#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace Pelmar {
namespace {

class Counted : public Object {
 public:
  explicit Counted(int& alive) : _alive(alive) { ++_alive; }
  ~Counted() override { --_alive; }

 private:
  int& _alive;
};

class DerivedCounted final : public Counted {
 public:
  using Counted::Counted;
};

TEST(Ref, IsNullByDefault) {
  const Ref<Counted> none;
  const Ref<Counted> null = nullptr;
  EXPECT_FALSE(none);
  EXPECT_FALSE(null);
  EXPECT_EQ(none.Get(), nullptr);
  EXPECT_EQ(none, null);
}

TEST(Ref, DeletesTheObjectWithItsLastOwner) {
  int alive = 0;
  Ref<Counted> first = MakeRef<Counted>(alive);
  Ref<Counted> second = first;
  EXPECT_EQ(first, second);
  first = nullptr;
  EXPECT_EQ(alive, 1);
  second = nullptr;
  EXPECT_EQ(alive, 0);
}

TEST(Ref, MovesOwnershipWithoutTouchingTheObject) {
  int alive = 0;
  Ref<Counted> source = MakeRef<Counted>(alive);
  Counted* const object = source.Get();
  const Ref<Counted> target = std::move(source);
  EXPECT_EQ(target.Get(), object);
  EXPECT_EQ(source.Get(), nullptr);  // NOLINT(bugprone-use-after-move): the moved-from state is promised.
  EXPECT_EQ(alive, 1);
}

TEST(Ref, SurvivesAssignmentToItself) {
  int alive = 0;
  Ref<Counted> ref = MakeRef<Counted>(alive);
  const Ref<Counted>& same = ref;
  ref = same;
  EXPECT_TRUE(ref);
  EXPECT_EQ(alive, 1);
}

TEST(Ref, SharesWithReferencesToBaseAndConstTypes) {
  int alive = 0;
  Ref<DerivedCounted> derived = MakeRef<DerivedCounted>(alive);
  Ref<Counted> base = derived;
  const Ref<const Counted> constant = base;
  EXPECT_TRUE(derived == constant);
  derived = nullptr;
  base = nullptr;
  EXPECT_EQ(alive, 1);
}

TEST(Ref, ReleasesTheReplacedObject) {
  int first = 0;
  int second = 0;
  Ref<Counted> ref = MakeRef<Counted>(first);
  ref = MakeRef<Counted>(second);
  EXPECT_EQ(first, 0);
  EXPECT_EQ(second, 1);
}

TEST(Ref, SwapsObjects) {
  int alive = 0;
  Ref<Counted> a = MakeRef<Counted>(alive);
  Ref<Counted> b;
  Counted* const object = a.Get();
  a.Swap(b);
  EXPECT_FALSE(a);
  EXPECT_EQ(b.Get(), object);
}

TEST(Ref, CountsOwnersOnManyThreads) {
  int alive = 0;
  Ref<Counted> shared = MakeRef<Counted>(alive);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([copy = shared] {
      for (int round = 0; round < 1000; ++round) {
        const Ref<Counted> another = copy;
        ASSERT_TRUE(another);
      }
    });
  }
  shared = nullptr;
  for (std::thread& thread : threads) {
    thread.join();
  }
  threads.clear();
  EXPECT_EQ(alive, 0);
}

TEST(Object, IsNotCopyable) {
  EXPECT_FALSE(std::is_copy_constructible<Counted>::value);
  EXPECT_FALSE(std::is_copy_assignable<Counted>::value);
}

}  // namespace
}  // namespace Pelmar
