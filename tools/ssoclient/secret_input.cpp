// SPDX-License-Identifier: Apache-2.0

#include "secret_input.h"

#include "exit_code.h"
#include "output.h"
#include "quiet_terminal.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <string_view>

#include <fcntl.h>
#include <unistd.h>

namespace SsoClient::Tool {
namespace {

constexpr int MAX_DESCRIPTOR = 65535;
constexpr std::size_t MAX_SECRET_BYTES = 4096;

[[noreturn]] void ThrowUnread(const std::string &place, const std::string &reason) {
  throw Tarvel::IOException(place + ": " + reason);
}

/// Reads octet by octet: what follows the line stays for the next reader, and no buffer keeps a copy of the secret.
/// @throws Tarvel::IOException naming `place`.
Tarvel::SecretText ReadLine(int descriptor, const std::string &place, const std::string &secretName) {
  Tarvel::SecretText secret;
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
    if (secret.Get().size() == MAX_SECRET_BYTES) {
      throw Tarvel::IOException("a password or passphrase is at most " + std::to_string(MAX_SECRET_BYTES) +
                                " octets long");
    }
    secret.Append(std::string_view(&octet, 1));
  }
}

void Prompt(int terminal, const std::string &text) {
  const std::string printable = Tarvel::StringUtil::Printable(text);
  // A terminal that cannot be written to can still be read.
  [[maybe_unused]] const ssize_t written = write(terminal, printable.data(), printable.size());
}

Tarvel::SecretText ReadFrom(int descriptor, const std::string &place, const std::string &secretName,
                            const std::string &prompt) {
  const QuietTerminal quiet(descriptor);
  if (quiet.IsTerminal()) {
    Prompt(descriptor, prompt);
  }
  return ReadLine(descriptor, place, secretName);
}

Tarvel::SecretText AskAtTerminal(const std::string &name, const std::string &prompt) {
  const int descriptor = open("/dev/tty", O_RDWR | O_CLOEXEC | O_NOCTTY);
  if (descriptor < 0) {
    throw UsageException("there is no terminal to prompt for the " + name + "; give --" + name + "-file or --" + name +
                         "-fd");
  }
  const InputDescriptor terminal(descriptor);
  return ReadFrom(descriptor, "terminal", name, prompt);
}

} // namespace

std::vector<Option> AddSecretOptions(CLI::App &app, SecretOptions &options, const std::string &group) {
  const std::string name = options.name;
  const Option file = AddOption(app, "--" + name + "-file", options.file,
                                "File whose first line is the " + name + "; \"-\" is standard input")
                          .TypeName("FILE")
                          .Group(group);
  const Option descriptor =
      AddOption(app, "--" + name + "-fd", options.descriptor, "Open descriptor whose next line is the " + name)
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

Tarvel::SecretText ReadSecret(const SecretOptions &options, const std::string &prompt) {
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
