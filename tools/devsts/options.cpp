// SPDX-License-Identifier: Apache-2.0

#include "options.h"

#include <CLI/CLI.hpp>

namespace DevSts {

namespace {

constexpr int USAGE = 2;
constexpr int LONGEST_TOLERANCE = 24 * 3600;

std::string Footer() {
  return "Faults:\n" + FaultHelp() +
         "\nA request to URL/fault/NAME gets that fault, whatever --fault says.\n"
         "At URL/fault/NAME/once/TEXT only the first request gets it; each TEXT is counted separately.\n"
         "\nThe service at /echo of the same port answers a SOAP 1.1 or 1.2 message with the same body, if its "
         "security\n"
         "header has a token of this service for the audience https://localhost/echo, or for any, and the message is\n"
         "signed with the token's key: body and timestamp, and nothing else but header blocks and the token. It "
         "refuses\n"
         "a message that it has received before. No fault changes its answers.\n"
         "\nExamples:\n"
         "  ssoclient-devsts --state ~/.cache/devsts\n"
         "      Serves alice@corp.example (password wonderland) and bob@corp.example (password builder) on a free\n"
         "      port, until it gets SIGTERM or SIGINT. The first line on standard output is JSON with the URLs and "
         "the\n"
         "      files to trust.\n"
         "  ssoclient-devsts --state DIR --port 8443 --users users.json\n"
         "      users.json: "
         "[{\"name\":\"carol@corp.example\",\"password\":\"...\",\"first\":\"Carol\",\"last\":\"Danvers\",\n"
         "      \"groups\":[\"users@corp.example\"]}]\n"
         "  ssoclient-devsts --state DIR --keytab sts.keytab\n"
         "      Also negotiates, for every service whose key is in the keytab. alice@CORP.EXAMPLE is the user\n"
         "      alice@corp.example.\n"
         "  ssoclient-devsts --state DIR --charset ISO-8859-1\n"
         "      Reads requests as ISO-8859-1 and answers in it, like a service whose requests declare no charset.\n"
         "  ssoclient-devsts --state DIR --fault wrong-signer\n"
         "      Signs every token with a key that no client trusts.\n";
}

/// @throws CLI::ValidationError for an unknown name
Fault RequireFault(const std::string &name) {
  const std::optional<Fault> fault = ParseFault(name);
  if (!fault) {
    throw CLI::ValidationError("--fault", "unknown fault '" + name + "'; see --help");
  }
  return *fault;
}

void AddEchoOptions(CLI::App &app, Options &options) {
  app.add_flag("--echo-bearer", options.acceptsBearer, "The echo service accepts bearer tokens, too");
  app.add_flag("--client-certificates", options.asksForCertificates,
               "Ask clients for a TLS certificate; the echo service accepts that of the token as proof");
}

} // namespace

std::variant<Options, int> ReadOptions(int argc, char **argv) {
  CLI::App app("A WS-Trust 1.3 token service for development and tests. It listens only on loopback.",
               "ssoclient-devsts");
  app.set_version_flag("--version", "ssoclient-devsts " SSOCLIENT_VERSION);
  app.footer(Footer());

  Options options;
  std::string faultName;
  int tolerance = static_cast<int>(options.tolerance.count());
  app.add_option("--state", options.state, "Folder for keys and certificates; created when it does not exist")
      ->required();
  app.add_option("--port", options.port, "Port to listen on; 0 chooses a free one")->capture_default_str();
  app.add_option("--users", options.users, "JSON file of the users; without it, alice and bob")->type_name("FILE");
  app.add_option("--keytab", options.keytab, "Keytab of the service's keys, for SPNEGO with Kerberos")
      ->type_name("FILE");
  app.add_option("--fault", faultName, "Misbehave at every request; the names are listed below")->type_name("NAME");
  app.add_option("--charset", options.charset, "Read requests and write answers in this charset")
      ->capture_default_str()
      ->type_name("NAME")
      ->check(CLI::IsMember({"UTF-8", "ISO-8859-1", "windows-1252"}, CLI::ignore_case));
  app.add_option("--tolerance", tolerance, "How far clocks may differ, in seconds")
      ->capture_default_str()
      ->check(CLI::Range(0, LONGEST_TOLERANCE));
  AddEchoOptions(app, options);
  app.add_flag("--until-eof", options.untilEof, "End when standard input ends");
  try {
    app.parse(argc, argv);
    if (!faultName.empty()) {
      options.fault = RequireFault(faultName);
    }
  } catch (const CLI::Success &success) { // --help and --version
    return app.exit(success);
  } catch (const CLI::ParseError &error) {
    std::cerr << "ssoclient-devsts: " << error.what() << '\n';
    return USAGE;
  }
  options.tolerance = std::chrono::seconds(tolerance);
  return options;
}

} // namespace DevSts
