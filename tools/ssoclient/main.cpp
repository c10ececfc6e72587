// SPDX-License-Identifier: Apache-2.0
/// @file
/// The tool `ssoclient`: reads the command line, runs the command, turns its failure into a message and an exit code.

#include "command.h"
#include "exit_code.h"

#include <csignal>
#include <map>

#include <unistd.h>

namespace SsoClient::Tool {
namespace {

constexpr Command COMMANDS[] = {
    {"verify", "Check a token as a relying service does, and show what is in it",
     "  ssoclient verify --trust sts.pem token.xml\n"
     "  ssoclient verify --trust sts.pem --trust next-sts.pem --tolerance 60 --format json - <token.xml\n",
     DefineVerify},
    {"inspect", "Show what a token says, without checking its signature or dates",
     "  ssoclient inspect token.xml\n"
     "  ssoclient inspect --format json - <token.xml\n",
     DefineInspect},
};

// Nothing is half done at any time that a later run could trip over, so the process may end on the spot.
extern "C" void EndInterrupted(int) {
  _exit(static_cast<int>(ExitCode::INTERRUPTED));
}

void CatchInterrupt() {
  struct sigaction previous = {};
  // A shell starts background work with SIGINT ignored, and it must stay so.
  if (sigaction(SIGINT, nullptr, &previous) == 0 && previous.sa_handler != SIG_IGN) {
    struct sigaction action = {};
    action.sa_handler = EndInterrupted;
    sigaction(SIGINT, &action, nullptr);
  }
}

/// The format that the command line asks for, also when it cannot be read as a whole.
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

void AddOutputOptions(CLI::App &app, OutputOptions &output) {
  static const std::map<std::string, Format> FORMATS = {
      {"text", Format::TEXT}, {"json", Format::JSON}, {"xml", Format::XML}};
  app.add_option_function<std::string>(
         "--format", [&output](const std::string &name) { output.format = FORMATS.at(name); },
         "How to write the result; xml is the token itself")
      ->check(CLI::IsMember({"text", "json", "xml"}))
      ->default_str("text")
      ->type_name("FORMAT");
  app.add_flag("-v,--verbose", output.verbose, "Write warnings also when the format is not text");
}

int Run(int argc, char **argv) {
  CLI::App app("Acquires, verifies and shows SAML 2.0 tokens of a WS-Trust 1.3 token service.", "ssoclient");
  app.set_version_flag("--version", "ssoclient " SSOCLIENT_VERSION);
  app.footer(ExitCodeHelp());
  app.require_subcommand(1);

  OutputOptions output;
  Action chosen;
  for (const Command &command : COMMANDS) {
    CLI::App *sub = app.add_subcommand(command.name, command.summary);
    sub->footer(std::string("Examples:\n") + command.examples);
    sub->final_callback([&chosen, action = command.define(*sub, output)] { chosen = action; });
    AddOutputOptions(*sub, output);
  }

  try {
    app.parse(argc, argv);
  } catch (const CLI::Success &success) { // --help and --version
    return app.exit(success);
  } catch (const CLI::ParseError &error) {
    if (app.get_subcommands().empty() && !app.remaining().empty()) {
      throw UsageException("unknown command or option '" + app.remaining().front() + "'; see ssoclient --help");
    }
    throw UsageException(std::string(error.what()) + "; see ssoclient --help");
  }
  chosen();
  return static_cast<int>(ExitCode::DONE);
}

} // namespace
} // namespace SsoClient::Tool

int main(int argc, char **argv) {
  using namespace SsoClient::Tool;
  try {
    CatchInterrupt();
    return Run(argc, argv);
  } catch (const std::exception &failure) {
    ReportFailure(failure, RequestedFormat(argc, argv));
    return static_cast<int>(Classify(failure).code);
  }
}
