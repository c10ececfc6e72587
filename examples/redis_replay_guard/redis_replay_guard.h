// SPDX-License-Identifier: Apache-2.0
/// @file
/// `RedisReplayGuard`, a replay guard that several processes and machines share.

#pragma once

#include <ssoclient/proof/replay_guard.h>

#include <hiredis/hiredis.h>

#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

/// Remembers messages in a Redis server. Safe on any thread: calls at the same time use connections of their own, and idle
/// connections are kept for later calls. Make it after the last `fork`, because processes must not share connections.
///
/// hiredis 0.14 writes to sockets without MSG_NOSIGNAL, so a program that uses this class must ignore SIGPIPE.
class RedisReplayGuard final : public SsoClient::ReplayGuard {
public:
  /// Does not connect yet.
  /// @param address "unix:" and the path of a socket, or a host name and a port such as "127.0.0.1:6379"
  /// @param timeout how long connecting may take, and how long the answer to a command
  /// @throws std::invalid_argument for an address of another form
  RedisReplayGuard(const std::string &address, std::chrono::milliseconds timeout);

  /// Answers UNAVAILABLE when the server does not answer in time, refuses the command (for example because its memory is
  /// full), or when `until` is not in the future.
  Answer Remember(const SsoClient::MessageIdentifier &identifier, const Tarvel::System::DateTime &until) override;

private:
  struct Disconnect {
    void operator()(redisContext *connection) const { redisFree(connection); }
  };
  struct Release {
    void operator()(redisReply *reply) const { freeReplyObject(reply); }
  };
  using Connection = std::unique_ptr<redisContext, Disconnect>;
  using Reply = std::unique_ptr<redisReply, Release>;

  Connection Connect() const;
  Connection FindIdle();
  void Keep(Connection connection);

  std::string m_host; // empty for a socket of this machine
  int m_port = 0;
  std::string m_path;
  timeval m_timeout{};
  std::mutex m_mutex;
  std::vector<Connection> m_idle;
};
