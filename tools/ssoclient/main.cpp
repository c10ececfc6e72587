// SPDX-License-Identifier: Apache-2.0
/// @file
/// The tool `ssoclient`: reads the command line, runs the command, turns its failure into a message and an exit code.

#include "command.h"
#include "exit_code.h"
#include "interruption.h"
#include "option.h"
#include "standard_streams.h"

#include <tarvel/crypto/system_configuration.h>

#include <CLI/CLI.hpp>
#include <boost/optional.hpp>

#include <algorithm>
#include <chrono>
#include <exception>
#include <map>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace SsoClient::Tool {
namespace {

constexpr Command COMMANDS[] = {
    {"acquire",
     "Ask the service for a token: by password, by an identity, by a Kerberos ticket, or in exchange for a "
     "token",
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem --user alice@corp.example\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --user alice@corp.example --password-file password.txt --out alice.xml\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --cert client.pem --key client.key --renewable --delegable --out client.xml\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --cert client.pem --key client.key --token client.xml --delegate-to bob@corp.example --lifetime 15m\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --user alice@corp.example --password-file password.txt --dialect cxf --profile saml2\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem --gss\n"
     "  ssoclient acquire --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --gss --service HTTP/sts.corp.example@CORP.EXAMPLE --client-keytab robot.keytab\n",
     Format::TEXT, DefineAcquire},
    {"token", "Print a fresh token; ask the service for one only when the cache has none",
     "  ssoclient token --cache alice.cache --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --user alice@corp.example --password-file password.txt\n"
     "  ssoclient token --cache client.cache --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --cert client.pem --key client.key --timeout 10\n",
     Format::XML, DefineToken},
    {"renew", "Ask the service for a new token to replace a renewable one",
     "  ssoclient renew --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem \\\n"
     "      --cert client.pem --key client.key --lifetime 1d --out client.xml --force client.xml\n",
     Format::TEXT, DefineRenew},
    {"validate", "Ask the service whether a token is valid",
     "  ssoclient validate --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem client.xml\n", Format::TEXT,
     DefineValidate},
    {"verify", "Check a token as a relying service does, and show what it says",
     "  ssoclient verify --trust sts.pem token.xml\n"
     "  ssoclient verify --trust sts.pem --explain token.xml\n"
     "  ssoclient verify --trust sts.pem --trust next-sts.pem --tolerance 60 --format json - <token.xml\n",
     Format::TEXT, DefineVerify},
    {"inspect", "Show what a token says, and how it deviates from the accepted form, without verifying it",
     "  ssoclient inspect token.xml\n"
     "  ssoclient inspect --format json - <token.xml\n",
     Format::TEXT, DefineInspect},
    {"sign", "Put a token into a SOAP message, and sign the message with the token's key",
     "  ssoclient sign --token client.xml --key client.key --out signed.xml envelope.xml\n"
     "  ssoclient sign --token client.xml --key client.key \\\n"
     "      --part '{http://www.w3.org/2005/08/addressing}To' - <envelope.xml\n"
     "  ssoclient sign --token alice.xml --trust sts.pem --lifetime 1m envelope.xml\n",
     Format::XML, DefineSign},
    {"check-message", "Check a SOAP message as the service that receives it does, and show what its sender proved",
     "  ssoclient check-message --trust sts.pem signed.xml\n"
     "  ssoclient check-message --trust sts.pem --explain signed.xml\n"
     "  ssoclient check-message --trust sts.pem --allow-bearer --accept-audience https://files.corp.example/ \\\n"
     "      --format json - <signed.xml\n",
     Format::TEXT, DefineCheckMessage},
    {"doctor", "Find out why a service cannot be used, without sending it any credential",
     "  ssoclient doctor --sts https://sts.corp.example/sts --ca ca.pem --trust sts.pem\n"
     "  ssoclient doctor --sts https://sts.corp.example/sts --ca ca.pem --timeout 5 --format json\n",
     Format::TEXT, DefineDoctor},
    {"dialect", "List the known dialects of services, or write one as JSON that can be edited",
     "  ssoclient dialect --format json\n"
     "  ssoclient dialect cxf >partner.json; ssoclient dialect partner.json\n",
     Format::TEXT, DefineDialect},
};

/// The format that the command line asks for; works also for a command line that has errors.
Format RequestedFormat(int argc, char **argv) {
  for (int i = 1; i < argc; ++i) {
    const std::string_view argument = argv[i];
    if (argument == "--format=json" ||
        (argument == "--format" && i + 1 < argc && std::string_view(argv[i + 1]) == "json")) {
      return Format::JSON;
    }
  }
  return Format::TEXT;
}

/// Whether `argument` is of the form "--name=".
bool HasEmptyValue(const std::string &argument) {
  return argument.size() > 3 && argument.compare(0, 2, "--") == 0 && argument.find('=') == argument.size() - 1;
}

/// The arguments of the process in the order that the parser expects: the last one first. "--name=" becomes "--name"
/// and an empty argument, since the parser would drop the empty text and use the next argument instead.
std::vector<std::string> ReadArguments(int argc, char **argv) {
  std::vector<std::string> arguments;
  bool mayBeOption = true;
  for (int i = 1; i < argc; ++i) {
    std::string argument = argv[i];
    mayBeOption = mayBeOption && argument != "--";
    const bool isEmptied = mayBeOption && HasEmptyValue(argument);
    if (isEmptied) {
      argument.pop_back();
    }
    arguments.push_back(std::move(argument));
    if (isEmptied) {
      arguments.emplace_back();
    }
  }
  std::reverse(arguments.begin(), arguments.end());
  return arguments;
}

bool IsOption(const std::string &argument) {
  return argument.size() > 1 && argument.front() == '-';
}

/// The name of the option in `argument`, without an attached value, which may be a secret.
std::string OptionName(const std::string &argument) {
  return argument.compare(0, 2, "--") == 0 ? argument.substr(0, argument.find('=')) : argument.substr(0, 2);
}

/// Describes what the command line should not have: the first unknown option or, if there is none, an argument. The
/// text of an argument, and of an option's argument, is left out, because it may be a secret in the wrong place.
std::string DescribeExtras(const std::vector<std::string> &extras) {
  const auto option = std::find_if(extras.begin(), extras.end(), IsOption);
  return option == extras.end() ? "too many arguments" : "not expected: " + OptionName(*option);
}

std::string Explain(const CLI::App &app, const CLI::ParseError &error) {
  const std::vector<std::string> extras = app.remaining(true);
  if (app.get_subcommands().empty() && !extras.empty()) {
    const std::string &first = extras.front();
    return "unknown command or option '" + (IsOption(first) ? OptionName(first) : first) + "'";
  }
  if (dynamic_cast<const CLI::ExtrasError *>(&error)) {
    return DescribeExtras(extras);
  }
  std::string message = error.what();
  if (dynamic_cast<const CLI::ConversionError *>(&error)) {
    return message.substr(0, message.find(" = ")); // without the value
  }
  return message;
}

/// The options of every command.
struct CommonOptions {
  OutputOptions output;
  boost::optional<std::chrono::microseconds> timeout;
  bool usesSystemCrypto = false;
};

void AddCommonOptions(CLI::App &app, Format format, CommonOptions &options) {
  OutputOptions &output = options.output;
  static const std::map<std::string, Format> FORMATS = {
      {"text", Format::TEXT}, {"json", Format::JSON}, {"xml", Format::XML}};
  app.add_option_function<std::string>(
         "--format", [&output](const std::string &name) { output.format = FORMATS.at(name); },
         "Format of the result; xml is the token itself")
      ->check(RefuseEmpty)
      ->check(CLI::IsMember({"text", "json", "xml"}))
      ->default_str(format == Format::XML ? "xml" : "text")
      ->type_name("FORMAT");
  AddOption(
      app, "--timeout", options.timeout,
      "How long the command may take, such as 2.5; then it ends with exit code 4. By default, it may take any time; "
      "a request may take four minutes")
      .TypeName("SECONDS");
  AddFlag(app, "-v,--verbose", output.verbose,
          "Write log lines, and the requests and responses without their content, to standard error; and warnings even "
          "when the format is json");
  app.add_flag("--system-crypto", options.usesSystemCrypto,
               "Use OpenSSL as this machine configures it, with its providers (FIPS, PKCS#11) and TLS settings");
}

int Run(int argc, char **argv) {
  CLI::App app("Acquires, renews, validates, verifies, shows and uses SAML 2.0 tokens of a WS-Trust 1.3 token service.",
               "ssoclient");
  app.set_version_flag("--version", "ssoclient " SSOCLIENT_VERSION);
  app.footer(ExitCodeHelp());
  app.require_subcommand(1);

  CommonOptions options;
  OutputOptions &output = options.output;
  Action chosen;
  for (const Command &command : COMMANDS) {
    CLI::App *sub = app.add_subcommand(command.name, command.summary);
    sub->footer(std::string("Examples:\n") + command.examples);
    const Action action = command.define(*sub, output);
    AddCommonOptions(*sub, command.format, options);
    sub->final_callback([&chosen, &output, action, sub, format = command.format] {
      chosen = action;
      if (sub->count("--format") == 0) {
        output.format = format;
      }
    });
  }

  try {
    app.parse(ReadArguments(argc, argv));
  } catch (const CLI::Success &success) { // --help and --version
    return app.exit(success);
  } catch (const CLI::ParseError &error) {
    throw UsageException(Explain(app, error) + "; see ssoclient --help");
  }
  WatchCommand(options.timeout, output.format);
  if (output.verbose) {
    ShowLibraryLog();
  }
  if (options.usesSystemCrypto) {
    Tarvel::Crypto::UseSystemConfiguration();
  }
  return static_cast<int>(chosen());
}

} // namespace
} // namespace SsoClient::Tool

int main(int argc, char **argv) {
  using namespace SsoClient::Tool;
  try {
    KeepStandardStreamsApart();
    const int exitCode = Run(argc, argv);
    FinishCommand();
    return exitCode;
  } catch (const std::exception &failure) {
    ReportAndFinish(failure, RequestedFormat(argc, argv));
    return static_cast<int>(Classify(failure).code);
  }
}
