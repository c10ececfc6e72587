// SPDX-License-Identifier: Apache-2.0
// What cancels an operation.
#include "manual_operation.h"

#include <boost/asio/bind_executor.hpp>
#include <boost/asio/io_context.hpp>
#ifdef SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS
#include <boost/asio/bind_cancellation_slot.hpp>
#include <boost/asio/cancellation_signal.hpp>
#endif

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <utility>

namespace Testing {
namespace {

using SsoClient::CallOptions;
using SsoClient::CancelSource;

TEST(CancelTokenOfTheOptions, CancelsTheOperation) {
  const CancelSource source;
  CallOptions options = CallOptions::WithTimeout(std::chrono::hours(1));
  options.cancelToken = source.GetToken();
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(calls.MakeHandler(), options);
  EXPECT_FALSE(operation.started.cancelToken.IsCancelled());
  EXPECT_TRUE(operation.started.deadline == options.deadline) << "all other options are passed";
  source.Cancel();
  EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
  operation.End(false);
}

TEST(ExecutorOfTheOptions, IsNotUsed) {
  CallOptions options;
  options.executor = [](const std::function<void()> &) { ADD_FAILURE() << "called"; };
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(calls.MakeHandler(), options);
  EXPECT_EQ(operation.started.executor, nullptr);
  operation.End(true);
  EXPECT_EQ(calls.count, 1);
}

#ifdef SSOCLIENT_ASIO_HAS_CANCELLATION_SLOTS
using boost::asio::bind_cancellation_slot;
using boost::asio::cancellation_signal;
using boost::asio::cancellation_type;

TEST(CancellationSlot, CancelsTheOperationWithAnyTypeOfCancellation) {
  for (const cancellation_type type :
       {cancellation_type::terminal, cancellation_type::partial, cancellation_type::total, cancellation_type::all}) {
    cancellation_signal signal;
    const CancelSource source;
    CallOptions options;
    options.cancelToken = source.GetToken();
    ManualOperation operation;
    HandlerCalls calls;
    operation.Run(bind_cancellation_slot(signal.slot(), calls.MakeHandler()), options);
    signal.emit(cancellation_type::none);
    EXPECT_FALSE(operation.started.cancelToken.IsCancelled());
    signal.emit(type);
    EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
    EXPECT_FALSE(source.IsCancelled());
    operation.End(false);
    EXPECT_EQ(calls.count, 1);
  }
}

TEST(CancellationSlot, DoesNotReplaceTheTokenOfTheOptions) {
  cancellation_signal signal;
  const CancelSource source;
  CallOptions options;
  options.cancelToken = source.GetToken();
  ManualOperation operation;
  HandlerCalls calls;
  operation.Run(bind_cancellation_slot(signal.slot(), calls.MakeHandler()), options);
  source.Cancel();
  EXPECT_TRUE(operation.started.cancelToken.IsCancelled());
  operation.End(false);
}

TEST(CancellationSlot, DoesNothingWhenTheOperationHasEnded) {
  cancellation_signal signal;
  ManualOperation operation;
  HandlerCalls calls;
  {
    boost::asio::io_context context;
    operation.Run(bind_cancellation_slot(signal.slot(), bind_executor(context, calls.MakeHandler())));
    operation.End(true);
    context.run();
  }
  signal.emit(cancellation_type::terminal);
  EXPECT_EQ(calls.count, 1);
}
#endif

} // namespace
} // namespace Testing
