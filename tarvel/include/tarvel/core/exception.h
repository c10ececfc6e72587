// SPDX-License-Identifier: Apache-2.0
/// @file
/// The root of every exception that the platform and the client throw, and the platform's general exceptions.

#pragma once

#include <tarvel/core/export.h>

#include <exception>
#include <memory>
#include <string>

namespace Tarvel {

/// A message text and the call stack at the place where the exception was made.
class TARVEL_API Exception : public std::exception {
public:
  /// An exception with the message and the current call stack.
  explicit Exception(const std::string &message);
  Exception(const Exception &) noexcept;
  Exception &operator=(const Exception &) noexcept;
  ~Exception() override;

  /// The message; valid as long as the exception. Never null.
  const char *what() const noexcept override;

  /// The call stack at construction, one frame on each line, with symbols where possible. Slow: for diagnostics only.
  virtual std::string GetBacktrace() const;

  /// Class, message and call stack in one text, for a diagnostic dump.
  virtual std::string Dump() const;

  /// The innermost frame of the call stack that is not the exception's own; empty when unknown.
  virtual std::string Where() const;

  /// A new copy of the same dynamic class. The caller owns it and deletes it; `Copy` returns an owner instead. It may
  /// be passed to another thread.
  virtual Exception *Clone() const;

  /// What `Clone` returns, with an owner that deletes it. Use this to keep an exception that is valid only during a
  /// call.
  std::unique_ptr<Exception> Copy() const;

  /// Throws a copy of the same dynamic class, so that code that has a reference to a base class throws the exact class.
  [[noreturn]] virtual void Throw() const;

protected:
  /// Has no message and no call stack, and so needs no memory: for a class that defines its own `what`.
  Exception() noexcept;

private:
  struct State;
  std::shared_ptr<const State> m_state; // null when there was no memory for it
};

/// Adds what every exception class needs (`Clone` and `Throw` of its own dynamic class) to a class body.
#define TARVEL_EXCEPTION_BODY(Class, Base)                                                                             \
public:                                                                                                                \
  explicit Class(const std::string &message) : Base(message) {}                                                        \
  Class(const Class &) noexcept = default;                                                                             \
  Class &operator=(const Class &) noexcept = default;                                                                  \
  ~Class() override;                                                                                                   \
  Class *Clone() const override;                                                                                       \
  [[noreturn]] void Throw() const override

/// Defines, in one source file, the members that `TARVEL_EXCEPTION_BODY` declares.
#define TARVEL_DEFINE_EXCEPTION(Class)                                                                                 \
  Class::~Class() = default;                                                                                           \
  Class *Class::Clone() const {                                                                                        \
    return new Class(*this);                                                                                           \
  }                                                                                                                    \
  void Class::Throw() const {                                                                                          \
    throw *this;                                                                                                       \
  }

/// An invalid argument. The message is "Invalid argument : " followed by the constructor's `detail`.
class TARVEL_API InvalidArgumentException : public Exception {
public:
  /// An exception whose message ends with `detail`.
  explicit InvalidArgumentException(const std::string &detail);
  InvalidArgumentException(const InvalidArgumentException &) noexcept = default;
  InvalidArgumentException &operator=(const InvalidArgumentException &) noexcept = default;
  ~InvalidArgumentException() override;
  InvalidArgumentException *Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// An operation that the state of its object does not allow. Also any operation that needs OpenSSL after OpenSSL has
/// cleaned itself up, with the message "OpenSSL has cleaned itself up: the process is about to end"; this says nothing
/// about the data that was passed to the operation.
class TARVEL_API InvalidStateException : public Exception {
  TARVEL_EXCEPTION_BODY(InvalidStateException, Exception);
};

/// An object that is not of the requested class.
class TARVEL_API TypeMismatchException : public Exception {
  TARVEL_EXCEPTION_BODY(TypeMismatchException, Exception);
};

/// Text that is not Base64 (RFC 4648, section 4; XML white space is allowed between characters).
class TARVEL_API Base64FormatException : public Exception {
  TARVEL_EXCEPTION_BODY(Base64FormatException, Exception);
};

/// Text that is not a date-time of the xsd:dateTime form, or one that is out of range.
class TARVEL_API DateTimeFormatException : public Exception {
  TARVEL_EXCEPTION_BODY(DateTimeFormatException, Exception);
};

/// Memory ran out in OpenSSL, or after an operation over HTTP or TLS was started. Any function that uses OpenSSL may
/// throw this exception; the completion of the operation receives it. (Elsewhere a call throws `std::bad_alloc`.) It
/// says nothing about the data that was being read, verified or sent. The message is always "There is not enough
/// memory"; there is no call stack.
class TARVEL_API OutOfMemoryException : public Exception {
public:
  OutOfMemoryException() noexcept = default;
  OutOfMemoryException(const OutOfMemoryException &) noexcept = default;
  OutOfMemoryException &operator=(const OutOfMemoryException &) noexcept = default;
  ~OutOfMemoryException() override;
  /// Always "There is not enough memory".
  const char *what() const noexcept override;
  OutOfMemoryException *Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// A file or stream that cannot be read or written; the message contains its name and the system's reason.
class TARVEL_API IOException : public Exception {
  TARVEL_EXCEPTION_BODY(IOException, Exception);
};

} // namespace Tarvel
