// SPDX-License-Identifier: Apache-2.0

#include "dialect_options.h"

#include "dialect_file.h"
#include "dialect_switches.h"
#include "exit_code.h"
#include "option.h"

#include <map>
#include <string_view>
#include <utility>

#include <sys/stat.h>

namespace SsoClient::Tool {
namespace {

constexpr const char *GROUP = "Dialect of the service";
constexpr std::string_view FILE_EXTENSION = ".json";

/// A value that the command line gives to a switch.
struct Setting {
  const DialectSwitch *known;
  std::string value;
  std::string option; ///< as it is on the command line
};

Setting ReadSetting(const std::string &text) {
  const std::size_t equals = text.find('=');
  if (equals == std::string::npos) {
    throw UsageException("--dialect-switch '" + text + "' is not of the form NAME=VALUE");
  }
  const DialectSwitch *const known = FindDialectSwitch(text.substr(0, equals));
  if (!known) {
    throw UsageException("--dialect-switch " + text + ": unknown switch; the switches are " + DialectSwitchNames());
  }
  return {known, text.substr(equals + 1), "--dialect-switch " + text};
}

std::vector<Setting> ReadSettings(const DialectOptions &options) {
  std::vector<Setting> settings;
  if (!options.appliesTo.empty()) {
    settings.push_back({FindDialectSwitch("applies-to"), options.appliesTo, "--applies-to " + options.appliesTo});
  }
  if (options.addressing) {
    settings.push_back({FindDialectSwitch("addressing"), "true", "--addressing"});
  }
  for (const std::string &text : options.switches) {
    settings.push_back(ReadSetting(text));
  }
  return settings;
}

/// Two different values for one switch are a mistake: it is not known which of them is meant.
void RefuseContradictions(const std::vector<Setting> &settings) {
  std::map<const DialectSwitch *, const Setting *> firsts;
  for (const Setting &setting : settings) {
    const Setting &first = *firsts.emplace(setting.known, &setting).first->second;
    if (first.value != setting.value) {
      throw UsageException(first.option + " and " + setting.option + " contradict each other");
    }
  }
}

bool LooksLikePath(std::string_view text) {
  return text.find('/') != std::string_view::npos || text.ends_with(FILE_EXTENSION);
}

bool Exists(const std::string &path) {
  struct stat facts = {};
  return stat(path.c_str(), &facts) == 0;
}

} // namespace

void AddDialectOptions(CLI::App &app, DialectOptions &options) {
  AddOption(app, "--dialect", options.dialect,
            "How requests to the service are written: a name that `ssoclient dialect` lists, or a JSON file")
      .TypeName("NAME|FILE")
      .Group(GROUP);
  AddOption(app, "--dialect-switch", options.switches, "Change one switch of the dialect; may be repeated")
      .TypeName("NAME=VALUE")
      .Group(GROUP);
  AddOption(app, "--applies-to", options.appliesTo,
            "Address of the service that will receive the token (wsp:AppliesTo)")
      .TypeName("URI")
      .Group(GROUP);
  AddFlag(app, "--addressing", options.addressing, "Send the headers of WS-Addressing 1.0").Group(GROUP);
}

ServiceDialect LoadDialect(const std::string &nameOrFile) {
  if (IsDialectName(nameOrFile)) {
    return GetServiceDialect(nameOrFile);
  }
  if (!LooksLikePath(nameOrFile) && !Exists(nameOrFile)) {
    throw UsageException("'" + nameOrFile + "' is neither a dialect nor a file; the dialects are " + DialectNames());
  }
  return ReadDialectFile(nameOrFile);
}

ServiceDialect ToDialect(const DialectOptions &options) {
  const std::vector<Setting> settings = ReadSettings(options);
  RefuseContradictions(settings);
  ServiceDialect dialect = options.dialect.empty() ? ServiceDialect() : LoadDialect(options.dialect);
  for (const Setting &setting : settings) {
    if (!setting.known->set(dialect, setting.value)) {
      throw UsageException(setting.option + ": must be " + setting.known->values());
    }
  }
  CheckServiceDialect(dialect);
  return dialect;
}

void CheckSpecFits(const TokenSpec &spec, const ServiceDialect &dialect) {
  if (spec.renewable && dialect.renewing == ServiceDialect::Statement::NEVER) {
    throw UsageException("--renewable cannot be asked for, because the dialect's switch renewing is never");
  }
  if (spec.delegable && dialect.delegatable == ServiceDialect::Statement::NEVER) {
    throw UsageException("--delegable cannot be asked for, because the dialect's switch delegatable is never");
  }
}

} // namespace SsoClient::Tool
