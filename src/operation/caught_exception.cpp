// SPDX-License-Identifier: Apache-2.0

#include "operation/caught_exception.h"

#include <ssoclient/logger.h>

#include <cstdlib>
#include <cxxabi.h>
#include <exception>
#include <memory>
#include <new>
#include <string_view>

namespace SsoClient {

namespace {

/// The texts of the exception that is being handled.
struct Caught {
  std::string className;
  std::string message;
};

Caught Describe(const SecretMask &mask) {
  try {
    throw;
  } catch (const std::exception &exception) {
    return {ClassNameOf(&typeid(exception)), mask.Apply(exception.what())};
  } catch (...) {
    return {ClassNameOf(CurrentExceptionClass()), ""};
  }
}

} // namespace

const std::type_info *CurrentExceptionClass() noexcept {
  return abi::__cxa_current_exception_type();
}

std::string ClassNameOf(const std::type_info *type) {
  if (!type) {
    return "unknown";
  }
  int status = 0;
  const std::unique_ptr<char, void (*)(void *)> demangled(abi::__cxa_demangle(type->name(), nullptr, nullptr, &status),
                                                          std::free);
  if (!demangled) {
    throw std::bad_alloc(); // the only possible reason, because the name of a type is valid
  }
  const std::string_view name = demangled.get();
  const std::string_view outer = name.substr(0, name.find('<'));
  const std::size_t separator = outer.rfind("::");
  return std::string(separator == std::string_view::npos ? outer : outer.substr(separator + 2));
}

void LogCaughtException(const std::string &id, const char *subject, const SecretMask &mask) noexcept {
  if (getLogger().GetLevel() < LOG_LEVEL_CONTRACT_WARNING) {
    return;
  }
  try {
    const Caught caught = Describe(mask);
    const std::string opId = id.empty() ? "" : "opId=" + id + " ";
    const std::string message = caught.message.empty() ? "" : ": " + caught.message;
    LogInternal(getLogger(), LOG_LEVEL_CONTRACT_WARNING, "%1%2 threw %3%4", opId, std::string(subject),
                caught.className, message);
  } catch (...) {
    // Without memory the line is lost, but the operation continues. NOLINT(bugprone-empty-catch)
  }
}

} // namespace SsoClient
