// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/ref.h>

#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

namespace Tarvel {
namespace {

class Counted : public Object {
public:
  explicit Counted(std::atomic<int> &alive) : m_alive(alive) { ++m_alive; }
  ~Counted() override { --m_alive; }

private:
  std::atomic<int> &m_alive;
};

class Derived final : public Counted {
public:
  using Counted::Counted;
};

TEST(Ref, DestroysTheObjectWithTheLastReference) {
  std::atomic<int> alive{0};
  Ref<Counted> first = MakeRef<Counted>(alive);
  Ref<Counted> second = first;
  first.reset();
  EXPECT_EQ(alive, 1);
  second = nullptr;
  EXPECT_EQ(alive, 0);
}

TEST(Ref, MoveLeavesNull) {
  std::atomic<int> alive{0};
  Ref<Derived> first = MakeRef<Derived>(alive);
  const Ref<Counted> second = std::move(first);
  EXPECT_FALSE(first);
  EXPECT_TRUE(second);
  EXPECT_EQ(alive, 1);
}

TEST(Ref, SelfAssignmentKeepsTheObject) {
  std::atomic<int> alive{0};
  Ref<Counted> ref = MakeRef<Counted>(alive);
  const Ref<Counted> &same = ref;
  ref = same;
  EXPECT_TRUE(ref);
  EXPECT_EQ(alive, 1);
}

TEST(Ref, DetachTransfersTheCount) {
  std::atomic<int> alive{0};
  Ref<Counted> ref = MakeRef<Counted>(alive);
  const Counted *const raw = ref.Detach();
  EXPECT_FALSE(ref);
  EXPECT_EQ(alive, 1);
  raw->Release();
  EXPECT_EQ(alive, 0);
}

TEST(Ref, ComparesByIdentity) {
  std::atomic<int> alive{0};
  const Ref<Derived> one = MakeRef<Derived>(alive);
  const Ref<Counted> same = one;
  const Ref<Counted> other = MakeRef<Counted>(alive);
  EXPECT_TRUE(one == same);
  EXPECT_TRUE(one != other);
}

TEST(Ref, CopiesOnSeveralThreadsDestroyTheObjectOnce) {
  constexpr int COPIES = 20'000;
  std::atomic<int> alive{0};
  Ref<Counted> shared = MakeRef<Counted>(alive);
  std::vector<std::thread> threads;
  for (int i = 0; i < 2; ++i) {
    threads.emplace_back([copy = shared] {
      for (int n = 0; n < COPIES; ++n) {
        const Ref<Counted> another = copy;
        ASSERT_TRUE(another);
      }
    });
  }
  shared.reset();
  for (std::thread &thread : threads) {
    thread.join();
  }
  threads.clear();
  EXPECT_EQ(alive, 0);
}

} // namespace
} // namespace Tarvel
