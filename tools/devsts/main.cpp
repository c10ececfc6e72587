// SPDX-License-Identifier: Apache-2.0
/// @file
/// The development token service: starts, writes the ready line, and serves until it must end.

#include "echo_service.h"
#include "https_listener.h"
#include "options.h"
#include "request_handler.h"
#include "shutdown.h"
#include "signature_engine.h"
#include "state_folder.h"
#include "token_service.h"
#include "users.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <cstdio>
#include <exception>
#include <stdexcept>
#include <string>
#include <utility>
#include <variant>

#include <sys/resource.h>
#include <unistd.h>

namespace DevSts {
namespace {

/// Raises the limit of descriptors, and so of connections, to the hard limit of the process.
void RaiseDescriptorLimit() {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) == 0) {
    limit.rlim_cur = limit.rlim_max;
    setrlimit(RLIMIT_NOFILE, &limit);
  }
}

void WriteReadyLine(const StateFolder &state, std::uint16_t port) {
  const nlohmann::ordered_json ready = {{"schema", 1},
                                        {"url", "https://localhost:" + std::to_string(port) + "/sts"},
                                        {"echo", "https://localhost:" + std::to_string(port) + "/echo"},
                                        {"port", port},
                                        {"pid", getpid()},
                                        {"ca", state.authority.certificateFile.string()},
                                        {"trust", state.signing.certificateFile.string()},
                                        {"thumbprint", ThumbprintOf(*state.tls.certificate)}};
  if (std::puts(ready.dump().c_str()) < 0 || std::fflush(stdout) != 0) {
    throw std::runtime_error("standard output cannot be written");
  }
}

void Serve(const Options &options) {
  const EndSignals endSignals;
  RaiseDescriptorLimit();
  const SignatureEngine engine;
  Users users = options.users ? Users(*options.users) : Users();
  const StateFolder state = OpenStateFolder(options.state);
  const TokenService service(state, std::move(users), options.tolerance,
                             options.keytab ? CreateGssAcceptor(*options.keytab, options.state / "replays") : nullptr);
  const EchoService echo(state, options.tolerance, options.acceptsBearer);
  const RequestHandler handler(service, echo, options.fault, Charset(options.charset));
  HttpsListener listener(state.tls, options.port, options.asksForCertificates, handler);
  listener.Start();
  WriteReadyLine(state, listener.GetPort());
  endSignals.Wait(options.untilEof);
}

} // namespace
} // namespace DevSts

int main(int argc, char **argv) {
  try {
    const std::variant<DevSts::Options, int> options = DevSts::ReadOptions(argc, argv);
    if (const int *exitCode = std::get_if<int>(&options)) {
      return *exitCode;
    }
    DevSts::Serve(std::get<DevSts::Options>(options));
    return 0;
  } catch (const std::exception &failure) {
    std::fprintf(stderr, "ssoclient-devsts: %s\n", failure.what());
    return 1;
  }
}
