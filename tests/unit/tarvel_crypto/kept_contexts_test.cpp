// SPDX-License-Identifier: Apache-2.0

#include "crypto/kept_contexts.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace Tarvel::Crypto {

namespace {

/// A substitute for a context, which records how many threads use it and whether it was freed.
struct Context {
  std::atomic<int> users{0};
  bool freed = false;
};

struct MarkAsFreed {
  void operator()(Context *context) const noexcept { context->freed = true; }
};

using Handle = std::unique_ptr<Context, MarkAsFreed>;
using Contexts = KeptContexts<Handle, 2>;

TEST(KeptContexts, AreEmptyAtFirst) {
  Contexts contexts;
  EXPECT_EQ(contexts.Acquire(0), nullptr);
  EXPECT_EQ(contexts.Acquire(1), nullptr);
}

TEST(KeptContexts, HandOutEachContextOnce) {
  Contexts contexts;
  Context context;
  contexts.Return(1, Handle(&context));
  EXPECT_EQ(contexts.Acquire(1).release(), &context);
  EXPECT_EQ(contexts.Acquire(1), nullptr);
  EXPECT_FALSE(context.freed);
}

TEST(KeptContexts, KeepTheKindsApart) {
  Contexts contexts;
  Context context;
  contexts.Return(1, Handle(&context));
  EXPECT_EQ(contexts.Acquire(0), nullptr);
  EXPECT_EQ(contexts.Acquire(1).release(), &context);
}

TEST(KeptContexts, HandOutAContextThatAnotherThreadReturned) {
  Contexts contexts;
  Context context;
  std::thread([&] { contexts.Return(0, Handle(&context)); }).join();
  EXPECT_EQ(contexts.Acquire(0).release(), &context);
}

TEST(KeptContexts, FreeContextsBeyondTheirCapacity) {
  Contexts contexts;
  std::vector<Context> many(5); // four of one kind are kept
  for (Context &context : many) {
    contexts.Return(0, Handle(&context));
  }
  EXPECT_FALSE(many[3].freed);
  EXPECT_TRUE(many[4].freed);
}

TEST(KeptContexts, FreeAllKeptContexts) {
  Contexts contexts;
  std::vector<Context> many(4);
  for (std::size_t index = 0; index < many.size(); ++index) {
    contexts.Return(index % 2, Handle(&many[index]));
  }
  contexts.FreeAll();
  for (const Context &context : many) {
    EXPECT_TRUE(context.freed);
  }
  EXPECT_EQ(contexts.Acquire(0), nullptr);
}

TEST(KeptContexts, HandOutAContextToOneThreadAtATime) {
  constexpr int ROUNDS = 2000;
  Contexts contexts;
  std::vector<Context> made(4); // as many as are kept, so none is ever freed
  for (Context &context : made) {
    contexts.Return(0, Handle(&context));
  }
  std::atomic<int> shared{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&] {
      for (int round = 0; round < ROUNDS; ++round) {
        Handle context = contexts.Acquire(0);
        if (!context) {
          continue; // other threads have all of them
        }
        shared += context->users.fetch_add(1) == 0 ? 0 : 1;
        context->users.fetch_sub(1);
        contexts.Return(0, std::move(context));
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
  EXPECT_EQ(shared, 0);
  for (const Context &context : made) {
    EXPECT_FALSE(context.freed);
  }
}

} // namespace

} // namespace Tarvel::Crypto
