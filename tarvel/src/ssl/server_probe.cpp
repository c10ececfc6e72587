// SPDX-License-Identifier: Apache-2.0

#include <tarvel/ssl/server_probe.h>

#include "ssl/handshake_record.h"
#include "ssl/ssl_context_impl.h"
#include "system/connect_target.h"
#include "system/shared_lookup.h"

#include <tarvel/core/checked_cast.h>

#include <boost/system/error_code.hpp>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <exception>
#include <future>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>

namespace Tarvel::Ssl {

namespace {

using System::AddressList;
using Clock = std::chrono::steady_clock;

std::int64_t MicrosecondsSince(Clock::time_point start) {
  return std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - start).count();
}

/// The time when a step that begins now must have ended. A longer time-out than a year counts as a year, because the
/// clock cannot represent every value.
Clock::time_point DeadlineOf(std::int64_t timeoutMicroseconds) {
  constexpr std::int64_t YEAR = std::int64_t{366} * 24 * 60 * 60 * 1'000'000;
  return Clock::now() + std::chrono::microseconds(std::clamp<std::int64_t>(timeoutMicroseconds, 0, YEAR));
}

std::string MessageOf(const Exception *failure) {
  return failure ? failure->what() : "";
}

std::string SystemText(int error) {
  return boost::system::system_category().message(error);
}

/// How an operation ended: the failure's message, empty for success; and how long it took.
struct End {
  std::string failure;
  std::int64_t durationMicroseconds = 0;
};

/// Waits for the one call of a completion handler.
class Completion {
public:
  /// The handler. It may outlive this object.
  auto GetHandler() {
    return [promise = m_promise, start = m_start](const Exception *failure) {
      promise->set_value({MessageOf(failure), MicrosecondsSince(start)});
    };
  }

  bool WaitUntil(Clock::time_point deadline) const { return m_end.wait_until(deadline) == std::future_status::ready; }

  /// Waits for the call. Call it only once.
  End Get() { return m_end.get(); }

private:
  const Clock::time_point m_start = Clock::now();
  const std::shared_ptr<std::promise<End>> m_promise = std::make_shared<std::promise<End>>();
  std::future<End> m_end = m_promise->get_future();
};

/// The result of a look-up. It is a class of this file so that no template with a type of Boost is exported.
struct FoundAddresses {
  AddressList addresses;
  std::optional<std::string> failure; // the reason why there is no address
};

/// @throws what the look-up threw, unless it is a NetworkException.
FoundAddresses MakeResult(const AddressList &addresses, const std::exception_ptr &failure) {
  if (!failure) {
    return {addresses, std::nullopt};
  }
  try {
    std::rethrow_exception(failure);
  } catch (const System::NetworkException &reason) {
    return {{}, reason.what()};
  }
}

/// The addresses of a name that is not an address. @throws NetworkException; the message is only the reason.
AddressList WaitForLookup(const std::string &host, Clock::time_point deadline) {
  const auto promise = std::make_shared<std::promise<FoundAddresses>>();
  std::future<FoundAddresses> result = promise->get_future();
  const Ref<System::ScheduledItem> lookup =
      System::StartSharedLookup(host, [promise](const AddressList &addresses, const std::exception_ptr &failure) {
        try {
          promise->set_value(MakeResult(addresses, failure));
        } catch (...) {
          promise->set_exception(std::current_exception());
        }
      });
  if (result.wait_until(deadline) != std::future_status::ready) {
    lookup->Cancel();
    throw System::TimeoutException("the resolver did not answer in time");
  }
  const FoundAddresses found = result.get();
  if (found.failure) {
    throw System::NetworkException(*found.failure);
  }
  return found.addresses;
}

AddressList LookUp(const std::string &host, int port, std::int64_t timeoutMicroseconds) {
  if (const std::string refusal = System::RefuseTarget(host, port); !refusal.empty()) {
    throw System::NetworkException(refusal);
  }
  if (const std::optional<boost::asio::ip::address> address = System::ParseAddress(host)) {
    return {*address};
  }
  return WaitForLookup(host, DeadlineOf(timeoutMicroseconds));
}

/// An attempt to connect to one address.
class Attempt {
public:
  Attempt(const boost::asio::ip::address &address, int port)
      : m_address(address.to_string()), m_target(System::DescribeTarget(m_address, port)) {
    m_socket->AsyncConnect(m_address, port, m_completion.GetHandler());
  }

  /// Waits for the attempt's end, at most until the deadline.
  AddressProbe Finish(Clock::time_point deadline) {
    const bool isOverdue = !m_completion.WaitUntil(deadline);
    if (isOverdue) {
      m_socket->Close(); // completes the attempt
    }
    End end = m_completion.Get();
    AddressProbe probe;
    probe.address = m_address;
    probe.durationMicroseconds = end.durationMicroseconds;
    // An overdue attempt may have succeeded just before its socket was closed.
    probe.reason = isOverdue ? "there was no answer in time" : WithoutTarget(std::move(end.failure));
    probe.outcome = Classify(probe.reason, isOverdue);
    return probe;
  }

  const std::string &GetTarget() const noexcept { return m_target; }
  const Ref<System::TcpClientSocket> &GetSocket() const noexcept { return m_socket; }

private:
  /// Removes the target, which the probe contains elsewhere.
  std::string WithoutTarget(std::string failure) const {
    const std::string begin = "Cannot connect to " + m_target + ": ";
    return failure.compare(0, begin.size(), begin) == 0 ? failure.substr(begin.size()) : std::move(failure);
  }

  static AddressProbe::Outcome Classify(const std::string &reason, bool isOverdue) {
    if (reason.empty()) {
      return AddressProbe::Outcome::ANSWERED;
    }
    if (isOverdue || reason == SystemText(ETIMEDOUT)) {
      return AddressProbe::Outcome::TIMED_OUT;
    }
    return reason == SystemText(ECONNREFUSED) ? AddressProbe::Outcome::REFUSED : AddressProbe::Outcome::FAILED;
  }

  const std::string m_address;
  const std::string m_target;
  const Ref<System::TcpClientSocket> m_socket = System::CreateTcpClientSocket();
  Completion m_completion;
};

/// A list of attempts. Its destructor closes all of their sockets.
class AttemptList {
public:
  AttemptList() = default;
  AttemptList(const AttemptList &) = delete;
  AttemptList &operator=(const AttemptList &) = delete;
  ~AttemptList() {
    for (const std::unique_ptr<Attempt> &attempt : m_attempts) {
      attempt->GetSocket()->Close();
    }
  }

  void Start(const boost::asio::ip::address &address, int port) {
    m_attempts.push_back(std::make_unique<Attempt>(address, port));
  }

  /// Waits for all attempts. @return the first one, in the order of the addresses, that has a connection, or null.
  const Attempt *Finish(Clock::time_point deadline, std::vector<AddressProbe> &probes) {
    const Attempt *connected = nullptr;
    for (const std::unique_ptr<Attempt> &attempt : m_attempts) {
      probes.push_back(attempt->Finish(deadline));
      if (!connected && probes.back().outcome == AddressProbe::Outcome::ANSWERED) {
        connected = attempt.get();
      }
    }
    return connected;
  }

private:
  std::vector<std::unique_ptr<Attempt>> m_attempts;
};

HandshakeProbe ProbeHandshake(SSLContextImpl &context, const Attempt &attempt, const std::string &host,
                              const std::string &parameter, std::int64_t timeoutMicroseconds) {
  const auto record = std::make_shared<HandshakeRecord>();
  const Ref<SSLStream> stream = context.CreateRecordedStream(attempt.GetSocket(), attempt.GetTarget(), record);
  Completion completion;
  stream->AsyncHandshake(host, parameter, completion.GetHandler());
  const bool isOverdue = !completion.WaitUntil(DeadlineOf(timeoutMicroseconds));
  stream->Close(); // completes the handshake
  const End end = completion.Get();
  HandshakeProbe probe = record->Take(end.failure);
  probe.durationMicroseconds = end.durationMicroseconds;
  if (isOverdue && !end.failure.empty()) {
    probe.outcome = HandshakeProbe::Outcome::TIMED_OUT;
    probe.failure = "The TLS handshake with " + host + " did not end in time";
  }
  return probe;
}

} // namespace

ServerProbe ProbeServer(const std::string &host, int port, const Ref<SSLContext> &context, const std::string &parameter,
                        std::int64_t timeoutMicroseconds) {
  const Ref<SSLContextImpl> ownContext = CheckedCast<SSLContextImpl>(Ref<Object>(context));
  ServerProbe probe;
  const Clock::time_point start = Clock::now();
  AddressList addresses;
  try {
    addresses = LookUp(host, port, timeoutMicroseconds);
  } catch (const System::NetworkException &failure) {
    probe.lookupFailure = failure.what();
  }
  probe.lookupMicroseconds = MicrosecondsSince(start);
  probe.addressCount = addresses.size();
  addresses.resize(std::min(addresses.size(), MAX_PROBED_ADDRESSES));

  AttemptList attempts;
  const Clock::time_point deadline = DeadlineOf(timeoutMicroseconds);
  for (const boost::asio::ip::address &address : addresses) {
    attempts.Start(address, port);
  }
  const Attempt *const connected = attempts.Finish(deadline, probe.addresses);
  if (connected && ownContext) {
    probe.handshake = ProbeHandshake(*ownContext, *connected, host, parameter, timeoutMicroseconds);
  }
  return probe;
}

} // namespace Tarvel::Ssl
