// SPDX-License-Identifier: Apache-2.0
/// @file
/// `OperationObserver`, through which a program follows the operations of a service: for metrics, traces and messages.

#pragma once

#include <ssoclient/export.h>

#include <cstddef>
#include <cstdint>
#include <string>

namespace SsoClient {

/// Which operation an event belongs to.
struct OperationInfo {
  std::string id;   ///< a UUID, the same as "opId" in the log, so the events of one operation can be joined
  std::string name; ///< the function, such as "AcquireToken"; "NegotiateToken" for a leg of a negotiation context
};

/// A request is about to be sent.
struct RequestSentEvent {
  std::string action;            ///< the value of the SOAPAction header
  std::size_t requestOctets = 0; ///< of the body
  int leg = 0;                   ///< of a negotiation, from 1; 0 for other operations
};

/// A response has been received, or the exchange failed.
struct ResponseReceivedEvent {
  int status = 0;                        ///< the HTTP status; 0 if there was no response
  std::string reason;                    ///< the reason phrase; or, without a response, why there is none
  std::string contentType;               ///< the header's value; empty without a response
  std::size_t responseOctets = 0;        ///< of the body, which is read only with a status of 2xx or 500
  std::int64_t durationMicroseconds = 0; ///< since the request was sent
  int leg = 0;                           ///< as in `RequestSentEvent`
};

/// The service answered with a SOAP fault.
struct FaultEvent {
  std::string codeNamespace; ///< of the fault code; empty if its prefix is not bound
  std::string codeName;      ///< the local name of the fault code
  std::string code;          ///< the fault code as the service wrote it
  std::string text;          ///< the `faultstring`
  std::string detail;        ///< the text in the `detail` element, without that of tokens and signatures
};

/// The operation has ended.
struct OperationEndedEvent {
  /// The kinds of outcome.
  enum class Outcome : std::int32_t { SUCCEEDED = 0, FAILED };

  Outcome outcome = Outcome::SUCCEEDED; ///< whether the operation returned a result or threw an exception
  /// The name of the exception's class, without namespaces. This name and the message are empty if the operation
  /// succeeded, and if there was no memory for them.
  std::string exceptionClass;
  std::string message;                   ///< the exception's text
  std::int64_t durationMicroseconds = 0; ///< since the operation started
};

/// The caller implements the functions that it needs; the others do nothing. The thread that runs the operation calls
/// them. Operations run on several threads at once, so the functions must be safe on any thread. They must not block,
/// because the operation waits for them. They must not throw: what they throw is written to the log (logger
/// "SsoClient", level 8) and changes nothing else.
///
/// The events of one operation arrive in this order: "started"; for each message "request sent", "response received",
/// and "fault" if the response is a fault; "ended". There is exactly one "ended" for each "started", also after a
/// failure.
///
/// No event contains a secret: no password, no text of a token, no value of a signature. If the service repeats the
/// operation's password in a fault, "***" is in its place. Names of persons may occur in the texts of a service.
///
/// Texts of the service and of exceptions are printable (`Tarvel::StringUtil::Printable`) and cut at
/// `Tarvel::StringUtil::MAX_VALUE_BYTES` bytes. In them, "***" replaces each secret of the operation as it is, escaped
/// for XML and in Base64, and all markup of tokens, signatures and passwords. This may hide more than necessary: a
/// password of one letter is masked in each word. If there are too many secrets, or not enough memory, to mask them, each
/// text is "***"; if there is not enough memory for an event, the event is missing, except "ended", which then has no texts.
class SSOCLIENT_API OperationObserver {
public:
  /// An operation has started. No request has been composed or sent yet.
  virtual void OnStarted(const OperationInfo &operation);
  /// A request is about to be sent.
  virtual void OnRequestSent(const OperationInfo &operation, const RequestSentEvent &event);
  /// A response has been received, or the exchange failed.
  virtual void OnResponseReceived(const OperationInfo &operation, const ResponseReceivedEvent &event);
  /// The response is a fault.
  virtual void OnFault(const OperationInfo &operation, const FaultEvent &event);
  /// The operation has ended.
  virtual void OnEnded(const OperationInfo &operation, const OperationEndedEvent &event);

protected:
  OperationObserver() = default;
  OperationObserver(const OperationObserver &) = default;
  OperationObserver &operator=(const OperationObserver &) = default;
  ~OperationObserver() = default;
};

} // namespace SsoClient
