// SPDX-License-Identifier: Apache-2.0
/// @file
/// `ProbeServer`, which finds out how far a connection to a server gets, and why it gets no further.

#pragma once

#include <tarvel/core/export.h>
#include <tarvel/core/ref.h>
#include <tarvel/crypto/certificate.h>
#include <tarvel/ssl/ssl_context.h>

#include <boost/optional.hpp>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace Tarvel::Ssl {

constexpr std::size_t MAX_PROBED_ADDRESSES = 16;    ///< of a name; a probe does not connect to more
constexpr std::size_t MAX_PROBED_CERTIFICATES = 20; ///< of a server's chain; a probe does not keep more
constexpr std::size_t MAX_PROBED_REFUSALS = 100;    ///< of a handshake; a probe does not keep more

/// One reason for which a handshake refuses a server.
struct ServerRefusal {
  /// The kinds of reasons.
  enum class Kind : std::int32_t {
    OTHER = 0,       ///< any other reason
    EXPIRED,         ///< a certificate is no longer valid
    NOT_YET_VALID,   ///< a certificate is not valid yet
    OTHER_NAME,      ///< the server's certificate is for other names
    UNKNOWN_ISSUER,  ///< the issuer of the chain's last certificate is neither in the chain nor trusted
    SELF_SIGNED,     ///< the server's certificate, or the last one of its chain, is its own issuer and not trusted
    WEAK_KEY,        ///< a certificate's key is too short
    WEAK_SIGNATURE,  ///< a certificate is signed with a weak algorithm
    WRONG_PURPOSE,   ///< a certificate is not for servers, or not for an authority
    OTHER_THUMBPRINT ///< the server's certificate has another thumbprint than the expected one
  };

  Kind kind = Kind::OTHER; ///< the kind of the reason
  std::string text;        ///< in the words of an `SSLException`, without the endpoint
  std::size_t depth = 0;   ///< of the certificate in the chain that was verified; 0 is the server's

  /// The certificate at that depth, which need not be one of those that the server sent. Null for one that cannot be
  /// read, and for `OTHER_THUMBPRINT`.
  Ref<const Crypto::Certificate> certificate;
};

/// What a TLS handshake has shown. The certificates are as the server sent them, and not verified unless the server was
/// accepted.
struct HandshakeProbe {
  /// How the handshake ended.
  enum class Outcome : std::int32_t {
    ACCEPTED = 0,        ///< a connection would be made
    CERTIFICATE_REFUSED, ///< see `refusals`
    PLAIN_HTTP,          ///< the server answers with HTTP, without TLS
    NOT_TLS,             ///< the server answers with something else
    NO_COMMON_VERSION,   ///< the server does not offer TLS 1.2 or later
    TOO_LONG,  ///< a message of the server, usually its chain of certificates, exceeds the limit of the TLS library
    TIMED_OUT, ///< the handshake did not end in time
    FAILED     ///< any other failure; see `failure`
  };

  Outcome outcome = Outcome::FAILED; ///< how it ended
  std::string failure; ///< the message of the exception that a connection gets; empty if the server was accepted
  std::int64_t durationMicroseconds = 0; ///< how long it took
  std::string version;                   ///< such as "TLSv1.3"; empty if none was agreed on
  std::string cipher;                    ///< the cipher suite's name; empty if none was agreed on

  /// The certificates that the server sent, its own first. Null for a certificate that cannot be read.
  Crypto::CertificateList chain;
  std::size_t chainLength = 0; ///< how many the server sent, including those that were not kept

  /// The trusted certificate at which the chain ends. Null if there is none, and if a thumbprint replaced the check of
  /// the chain.
  Ref<const Crypto::Certificate> anchor;

  /// The reasons to refuse the server, at most 100, in the order in which they were found. `failure` reports the first.
  std::vector<ServerRefusal> refusals;
};

/// One address of a server.
struct AddressProbe {
  /// How the attempt to connect ended.
  enum class Outcome : std::int32_t {
    ANSWERED = 0, ///< a TCP connection was made
    REFUSED,      ///< no program listens at the port
    TIMED_OUT,    ///< there was no answer in time
    FAILED        ///< any other failure
  };

  std::string address;                   ///< IPv4 or IPv6, without brackets
  Outcome outcome = Outcome::FAILED;     ///< how it ended
  std::string reason;                    ///< why no connection was made, as text; empty if the address answered
  std::int64_t durationMicroseconds = 0; ///< how long it took
};

/// What `ProbeServer` has found.
struct ServerProbe {
  std::string lookupFailure;           ///< why the name has no address; empty if it has
  std::int64_t lookupMicroseconds = 0; ///< how long the look-up took
  std::size_t addressCount = 0;        ///< how many addresses the name has, also those that were not tried
  std::vector<AddressProbe> addresses; ///< in the order in which a connection tries them

  /// The handshake with the first of `addresses` that answered; `boost::none` if none answered, and without a context.
  boost::optional<HandshakeProbe> handshake;
};

/// Looks up `host`, connects to its addresses, and performs a TLS handshake with the first in the list that answered.
/// The same code as for every other connection decides whether the server is accepted, but here it continues after the
/// first reason to refuse a certificate, and records each. The connection is closed after the handshake, whether or not
/// the server was accepted; nothing else is sent. No session is resumed. The call blocks the thread, which must not be
/// an I/O thread.
/// @param host as in `System::TcpClientSocket::AsyncConnect`.
/// @param port 1 to 65535.
/// @param context what to trust, made by `CreateSSLContext`; null to perform no handshake.
/// @param parameter as in `SSLStream::AsyncHandshake`.
/// @param timeoutMicroseconds for each of the three steps.
/// @throws TypeMismatchException for a context of another class. @throws InvalidStateException when there are no threads
///         or descriptors, and when OpenSSL has cleaned itself up before the handshake. What is wrong with the server is
///         never an exception.
TARVEL_API ServerProbe ProbeServer(const std::string &host, int port, const Ref<SSLContext> &context,
                                   const std::string &parameter, std::int64_t timeoutMicroseconds);

} // namespace Tarvel::Ssl
