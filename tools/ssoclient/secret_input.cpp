// SPDX-License-Identifier: Apache-2.0

#include "secret_input.h"

#include "exit_code.h"
#include "interruption.h"
#include "output.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/secure_wipe.h>

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

constexpr int MAX_DESCRIPTOR = 65535;

[[noreturn]] void ThrowUnread(const std::string &place, const std::string &reason) {
  throw Tarvel::IOException(place + ": " + reason);
}

/// Reads octet by octet, so that what follows the line stays for whoever reads on.
/// @throws Tarvel::IOException naming `place`.
Secret ReadLine(int descriptor, const std::string &place, const std::string &secretName) {
  Secret secret;
  bool isEmpty = true;
  for (;;) {
    char octet = 0;
    const ssize_t count = read(descriptor, &octet, 1);
    if (count < 0 && errno == EINTR) {
      continue;
    }
    if (count < 0) {
      ThrowUnread(place, std::strerror(errno));
    }
    if (count == 0 && isEmpty) {
      ThrowUnread(place, "there is no " + secretName);
    }
    if (count == 0 || octet == '\n') {
      return secret;
    }
    isEmpty = false;
    secret.Append(octet);
  }
}

void Prompt(int terminal, const std::string &text) {
  const std::string printable = Printable(text);
  // A terminal that is open for reading only still gives the secret.
  [[maybe_unused]] const ssize_t written = write(terminal, printable.data(), printable.size());
}

Secret ReadFrom(int descriptor, const std::string &place, const std::string &secretName, const std::string &prompt) {
  const QuietTerminal quiet(descriptor);
  if (quiet.IsTerminal()) {
    Prompt(descriptor, prompt);
  }
  return ReadLine(descriptor, place, secretName);
}

Secret AskAtTerminal(const std::string &name, const std::string &prompt) {
  const int descriptor = open("/dev/tty", O_RDWR | O_CLOEXEC | O_NOCTTY);
  if (descriptor < 0) {
    throw UsageException("there is no terminal to prompt for the " + name + "; give --" + name + "-file or --" + name +
                         "-fd");
  }
  const InputDescriptor terminal(descriptor);
  return ReadFrom(descriptor, "terminal", name, prompt);
}

} // namespace

Secret::~Secret() {
  Tarvel::SecureWipe(m_text);
}

void Secret::Append(char octet) {
  if (m_text.size() == MAX_BYTES) {
    throw Tarvel::IOException("a password or passphrase is at most " + std::to_string(MAX_BYTES) + " octets long");
  }
  m_text.push_back(octet);
}

std::vector<Option> AddSecretOptions(CLI::App &app, SecretOptions &options, const std::string &group) {
  const std::string name = options.name;
  const Option file = AddOption(app, "--" + name + "-file", options.file,
                                "File with the " + name + " in its first line; \"-\" is standard input")
                          .TypeName("FILE")
                          .Group(group);
  const Option descriptor =
      AddOption(app, "--" + name + "-fd", options.descriptor, "Open descriptor to read the " + name + " from, a line")
          .Within(0, MAX_DESCRIPTOR)
          .TypeName("N")
          .Group(group)
          .Excludes(file);
  return {file, descriptor};
}

void ClaimInput(const SecretOptions &options, InputClaims &claims) {
  claims.ClaimFile(options.file, std::string("--") + options.name + "-file");
  claims.ClaimDescriptor(options.descriptor, std::string("--") + options.name + "-fd");
}

Secret ReadSecret(const SecretOptions &options, const std::string &prompt) {
  if (options.descriptor >= 0) {
    return ReadFrom(options.descriptor, "descriptor " + std::to_string(options.descriptor), options.name, prompt);
  }
  if (!options.file.empty()) {
    const InputDescriptor input(options.file);
    return ReadFrom(input.Get(), options.file, options.name, prompt);
  }
  return AskAtTerminal(options.name, prompt);
}

} // namespace SsoClient::Tool
