// SPDX-License-Identifier: Apache-2.0

#include "input_descriptor.h"

#include "exit_code.h"

#include <tarvel/core/exception.h>

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

int Open(const std::string &path) {
  if (path == "-") {
    return STDIN_FILENO;
  }
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY);
  if (descriptor < 0) {
    throw Tarvel::IOException(path + ": " + std::strerror(errno));
  }
  return descriptor;
}

} // namespace

InputDescriptor::InputDescriptor(const std::string &path) : m_descriptor(Open(path)) {}

InputDescriptor::~InputDescriptor() {
  if (m_descriptor != STDIN_FILENO) {
    close(m_descriptor);
  }
}

void InputClaims::ClaimFile(const std::string &path, const std::string &option) {
  ClaimDescriptor(path == "-" ? STDIN_FILENO : -1, option);
}

void InputClaims::ClaimDescriptor(int descriptor, const std::string &option) {
  if (descriptor < 0) {
    return;
  }
  const auto [first, isNew] = m_options.emplace(descriptor, option);
  if (!isNew) {
    const std::string what = descriptor == STDIN_FILENO ? "standard input" : "descriptor " + std::to_string(descriptor);
    throw UsageException(first->second + " and " + option + " cannot both read " + what);
  }
}

} // namespace SsoClient::Tool
