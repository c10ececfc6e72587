// SPDX-License-Identifier: Apache-2.0
#include "core/fork_gate.h"
#include "support/completion.h"
#include "system/io_engine.h"

#include <boost/asio/post.hpp>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <optional>

namespace Tarvel::System {
namespace {

/// What `function` returns on the I/O thread with this number.
template <typename Function>
auto RunOn(std::size_t thread, const Function &function) {
  const auto task = std::make_shared<std::packaged_task<decltype(function())()>>(function);
  const Computation computing;
  boost::asio::post(GetIoContextOf(thread), [task] { (*task)(); });
  const HostCall call;
  return task->get_future().get();
}

TEST(IoContext, IsTheThreadsOwnOnAnIoThread) {
  for (std::size_t thread = 0; thread < IO_THREADS; ++thread) {
    EXPECT_EQ(RunOn(thread, [] { return &GetIoContext(); }), &GetIoContextOf(thread));
    EXPECT_EQ(RunOn(thread, [] { return &SocketContext().Get(); }), &GetIoContextOf(thread));
  }
}

TEST(IoContext, IsTheOneWithTheFewestSocketsOnOtherThreads) {
  ASSERT_TRUE(Testing::DrainIoThreads()); // no socket of an earlier test is left
  std::optional<SocketContext> first(std::in_place);
  const SocketContext second;
  EXPECT_NE(&first->Get(), &second.Get());
  const boost::asio::io_context &free = first->Get();
  first.reset();
  EXPECT_EQ(&GetIoContext(), &free);
  const SocketContext third;
  EXPECT_EQ(&third.Get(), &free);
}

TEST(IoContext, RunsWhileTheOtherThreadIsBusy) {
  std::promise<void> end;
  const std::shared_future<void> ended(end.get_future());
  const auto begun = std::make_shared<std::promise<void>>();
  {
    const Computation computing;
    boost::asio::post(GetIoContextOf(0), [ended, begun] {
      begun->set_value();
      const HostCall call;
      ended.wait();
    });
  }
  begun->get_future().wait();
  EXPECT_TRUE(RunOn(1, [] { return true; }));
  end.set_value();
  EXPECT_TRUE(Testing::DrainIoThreads());
}

} // namespace
} // namespace Tarvel::System
