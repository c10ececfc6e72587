// SPDX-License-Identifier: Apache-2.0
/// @file
/// The one implementation of `TcpClientSocket`, over Asio's socket.

#pragma once

#include "core/fork_gate.h"
#include "system/io_engine.h"
#include "system/name_lookup.h"

#include <tarvel/system/stream.h>

#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/steady_timer.hpp>

#include <chrono>
#include <exception>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace Tarvel::System {

/// How long an address of a name may leave the connect unanswered while there are further ones to try: long enough for
/// two repetitions of a lost packet.
constexpr std::chrono::seconds MAX_ATTEMPT_TIME{5};

class TcpClientSocketImpl final : public TcpClientSocket, private ClosesInChild {
public:
  /// Within a computation.
  TcpClientSocketImpl();

  void AsyncConnect(const std::string &host, int port, ConnectHandler handler) override;
  void AsyncReadSome(char *buffer, std::size_t length, TransferHandler handler) override;
  void AsyncWrite(const char *bytes, std::size_t length, TransferHandler handler) override;
  void Close() noexcept override;

  /// Whether the connect has ended, well or badly, or was never started and never will be.
  bool IsConnectDone() const noexcept;

private:
  enum class Stage { FRESH, CONNECTING, CONNECTED, ENDED };

  ~TcpClientSocketImpl() override;

  void CloseInChild() noexcept override;

  // Of the connect. All but those that begin with "On" are called under the lock.
  void StartConnect(const std::string &host);
  void OnLookup(const AddressList &addresses, const std::exception_ptr &failure);
  void TryAddresses(AddressList addresses);
  void TryNextAddress();
  bool OpenSocket(const boost::asio::ip::tcp::endpoint &endpoint, boost::system::error_code &error);
  void OnConnectAttempt(const boost::system::error_code &error);
  void LimitAttempt();
  void NoteFailedAttempt(const boost::system::error_code &error);
  template <typename Step>
  void TryStep(const Step &step) noexcept;
  void EndConnect(std::string_view reason) noexcept;
  void OnConnectEnd();

  struct PendingWrite;
  void WriteSome(const std::shared_ptr<PendingWrite> &pending);
  void OnWritten(const std::shared_ptr<PendingWrite> &pending, const boost::system::error_code &error,
                 std::size_t count);
  void OnRead(const TransferHandler &handler, const boost::system::error_code &error, std::size_t count);
  void CompleteRead(const TransferHandler &handler, const boost::system::error_code &error, std::size_t count) const;

  NetworkException DescribeTransferFailure(const boost::system::error_code &error) const noexcept;

  mutable ForkSafeMutex m_mutex; // guards all that follows; never held while a handler runs
  boost::asio::ip::tcp::socket m_socket;
  Stage m_stage = Stage::FRESH;
  bool m_isOfParent = false; // so that nobody is to be called
  std::string m_target;      // "host:port" or "[v6 address]:port", for messages; set once
  int m_port = 0;

  // How reading and writing ended: Asio may wait for ever when it is asked again.
  boost::system::error_code m_readEnd;
  boost::system::error_code m_writeEnd;

  // While connecting.
  ConnectHandler m_connectHandler;
  boost::asio::steady_timer
      m_connectEnd; // never expires: cancelled, it calls the handler, and needs no memory for that
  std::optional<NetworkException> m_connectFailure;
  Ref<ScheduledItem> m_lookup;
  AddressList m_addresses;
  std::size_t m_nextAddress = 0;
  std::string m_attempts; // the reasons of the failed ones
  boost::asio::steady_timer m_attemptTimer;
  bool m_isAttemptOverdue = false;
};

} // namespace Tarvel::System
