// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/exception.h>

#include "core/demangle.h"

#include <boost/stacktrace/frame.hpp>
#include <boost/stacktrace/safe_dump_to.hpp>

#include <algorithm>
#include <array>
#include <cstddef>
#include <span>
#include <string_view>
#include <typeinfo>

namespace Tarvel {

namespace {

/// The maximum number of frames that an exception keeps of its call stack. It is small because exceptions are made far
/// more often than their stacks are read.
constexpr std::size_t MAX_FRAMES = 32;

using Address = boost::stacktrace::frame::native_frame_ptr_t;

/// Whether `function` is the name of an exception class's constructor: "Space::SomeException::SomeException(…".
bool IsExceptionConstructor(std::string_view function) {
  constexpr std::string_view SUFFIX = "Exception";
  const std::string_view name = function.substr(0, function.find('('));
  const std::size_t separator = name.rfind("::");
  if (separator == std::string_view::npos) {
    return false;
  }
  const std::string_view member = name.substr(separator + 2);
  const std::string_view scope = name.substr(0, separator);
  return member.ends_with(SUFFIX) && scope.ends_with(member) &&
         (scope.size() == member.size() || scope[scope.size() - member.size() - 1] == ':');
}

} // namespace

struct Exception::State {
  State(const std::string &text, Address caller) : message(text) {
    // Only addresses are recorded here; names are looked up when a caller asks for them.
    const std::size_t written = boost::stacktrace::safe_dump_to(frames.data(), sizeof frames);
    const auto end = std::find(frames.begin(), frames.begin() + static_cast<std::ptrdiff_t>(written), nullptr);
    const auto first = std::find(frames.begin(), end, caller);
    // The frames before that of the constructor's caller belong to the code that records the stack.
    begin = first == end ? 0 : static_cast<std::size_t>(first - frames.begin());
    count = static_cast<std::size_t>(end - frames.begin()) - begin;
  }

  std::span<const Address> Stack() const noexcept { return std::span(frames).subspan(begin, count); }

  std::string message;
  std::array<Address, MAX_FRAMES + 1> frames{};
  std::size_t begin = 0;
  std::size_t count = 0;
};

// Never inlined, so that its return address is where the exception was made, or in the constructor of a derived class.
__attribute__((noinline)) Exception::Exception(const std::string &message)
    : m_state(std::make_shared<const State>(message, __builtin_return_address(0))) {}

Exception::Exception() noexcept = default;
Exception::Exception(const Exception &) noexcept = default;
Exception &Exception::operator=(const Exception &) noexcept = default;
Exception::~Exception() = default;

const char *Exception::what() const noexcept {
  return m_state ? m_state->message.c_str() : "";
}

std::string Exception::GetBacktrace() const {
  std::string text;
  for (const Address address : m_state ? m_state->Stack() : std::span<const Address>()) {
    text += boost::stacktrace::to_string(boost::stacktrace::frame(address));
    text += '\n';
  }
  return text;
}

std::string Exception::Dump() const {
  return Demangle(typeid(*this).name()) + ": " + what() + '\n' + GetBacktrace();
}

std::string Exception::Where() const {
  for (const Address address : m_state ? m_state->Stack() : std::span<const Address>()) {
    const boost::stacktrace::frame frame(address);
    if (!IsExceptionConstructor(frame.name())) {
      return boost::stacktrace::to_string(frame);
    }
  }
  return {};
}

Exception *Exception::Clone() const {
  return new Exception(*this);
}

std::unique_ptr<Exception> Exception::Copy() const {
  return std::unique_ptr<Exception>(Clone());
}

void Exception::Throw() const {
  throw *this;
}

InvalidArgumentException::InvalidArgumentException(const std::string &detail)
    : Exception("Invalid argument : " + detail) {}

TARVEL_DEFINE_EXCEPTION(InvalidArgumentException)
TARVEL_DEFINE_EXCEPTION(InvalidStateException)
TARVEL_DEFINE_EXCEPTION(TypeMismatchException)
TARVEL_DEFINE_EXCEPTION(Base64FormatException)
TARVEL_DEFINE_EXCEPTION(DateTimeFormatException)
TARVEL_DEFINE_EXCEPTION(IOException)
TARVEL_DEFINE_EXCEPTION(OutOfMemoryException)

const char *OutOfMemoryException::what() const noexcept {
  return "There is not enough memory";
}

} // namespace Tarvel
