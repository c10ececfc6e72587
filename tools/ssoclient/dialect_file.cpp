// SPDX-License-Identifier: Apache-2.0

#include "dialect_file.h"

#include "dialect_switches.h"
#include "input_descriptor.h"
#include "output.h"

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>
#include <stdexcept>
#include <string_view>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;

constexpr const char *BASE = "base";
constexpr const char *NAMESPACE = "namespace";
constexpr const char *NAME = "name";

/// Why a text is not a dialect.
class DialectProblem : public std::runtime_error {
public:
  using std::runtime_error::runtime_error;
};

/// The content of a regular file. A named pipe is refused without waiting for its writer.
std::string ReadRegularFile(const std::string &path) {
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK);
  if (descriptor < 0) {
    throw Tarvel::IOException(path + ": " + std::strerror(errno));
  }
  const InputDescriptor file(descriptor);
  struct stat facts = {};
  if (fstat(descriptor, &facts) != 0 || !S_ISREG(facts.st_mode)) {
    throw Tarvel::IOException(path + ": is not a regular file");
  }
  return ReadInput(file, path, MAX_DIALECT_BYTES + 1);
}

bool IsUtf8(const std::string &text) {
  try {
    [[maybe_unused]] const std::string written = nlohmann::json(text).dump();
    return true;
  } catch (const nlohmann::json::type_error &) {
    return false;
  }
}

/// @param byte counts from 1
std::string PlaceOf(const std::string &text, std::size_t byte) {
  const std::string_view before(text.data(), std::min(byte == 0 ? 0 : byte - 1, text.size()));
  const auto line = std::count(before.begin(), before.end(), '\n') + 1;
  const std::size_t lineBegin = before.rfind('\n') + 1; // 0 if there is no line feed
  return "line " + std::to_string(line) + ", column " + std::to_string(before.size() - lineBegin + 1);
}

/// The value, shortened if it is long, unless it contains others.
std::string Show(const Json &value) {
  return value.is_structured() ? std::string("an ") + value.type_name()
                               : Tarvel::StringUtil::Shorten(value.dump(-1, ' ', true));
}

/// Refuses a key that occurs twice: the parser would keep the last value, but a person who reads the file may see only
/// the first.
Json ParseWithUniqueKeys(const std::string &text) {
  std::vector<std::set<std::string>> keysOfOpenObjects;
  const auto refuseTwice = [&](int, Json::parse_event_t event, const Json &parsed) {
    if (event == Json::parse_event_t::object_start) {
      keysOfOpenObjects.emplace_back();
    } else if (event == Json::parse_event_t::object_end) {
      keysOfOpenObjects.pop_back();
    } else if (event == Json::parse_event_t::key) {
      const auto &key = parsed.get_ref<const std::string &>();
      if (!keysOfOpenObjects.back().insert(key).second) {
        throw DialectProblem("the key " + Show(key) + " occurs twice");
      }
    }
    return true;
  };
  try {
    return Json::parse(text, refuseTwice);
  } catch (const Json::parse_error &error) {
    throw DialectProblem("is not JSON at " + PlaceOf(text, error.byte));
  } catch (const Json::out_of_range &) {
    throw DialectProblem("has a number that is out of range");
  }
}

[[noreturn]] void RefuseValue(const std::string &key, const std::string &wanted, const Json &found) {
  throw DialectProblem(key + ": must be " + wanted + ", and is " + Show(found));
}

const std::string &RequireText(const std::string &key, const std::string &wanted, const Json &value) {
  if (!value.is_string()) {
    RefuseValue(key, wanted, value);
  }
  return value.get_ref<const std::string &>();
}

constexpr const char *FAULT_FORM = "the texts \"namespace\" and \"name\"";

[[noreturn]] void RefuseFaultKey(const std::string &key, const std::string &unknown) {
  throw DialectProblem(key + ": unknown key " + Show(unknown) + "; the keys are namespace and name");
}

const std::string &ReadFaultText(const std::string &key, const Json &fault, const char *part) {
  if (!fault.contains(part)) {
    throw DialectProblem(key + ": each element: must have " + FAULT_FORM);
  }
  return RequireText(key + ": " + part, "a text", fault[part]);
}

FaultName ReadFault(const std::string &key, const Json &value) {
  if (!value.is_object()) {
    RefuseValue(key + ": each element", std::string("an object with ") + FAULT_FORM, value);
  }
  for (const auto &[part, text] : value.items()) {
    if (part != NAMESPACE && part != NAME) {
      RefuseFaultKey(key, part);
    }
  }
  return {ReadFaultText(key, value, NAMESPACE), ReadFaultText(key, value, NAME)};
}

void ReadFaults(const std::string &key, const Json &value, ServiceDialect &dialect) {
  if (!value.is_array()) {
    RefuseValue(key, "an array", value);
  }
  dialect.credentialFaults.clear();
  for (const Json &fault : value) {
    dialect.credentialFaults.push_back(ReadFault(key, fault));
  }
}

void ReadSwitch(const std::string &key, const Json &value, ServiceDialect &dialect) {
  const DialectSwitch *const known = FindDialectSwitch(key);
  if (!known) {
    throw DialectProblem("unknown key " + Show(key) + "; the keys are base, " + DialectSwitchNames());
  }
  if (known->jsonType == DialectSwitch::JsonType::FAULTS) {
    ReadFaults(key, value, dialect);
    return;
  }
  const bool isBoolean = known->jsonType == DialectSwitch::JsonType::BOOLEAN;
  if (isBoolean != value.is_boolean()) {
    RefuseValue(key, known->values(), value);
  }
  const std::string text = isBoolean ? value.dump() : RequireText(key, known->values(), value);
  if (!known->set(dialect, text)) {
    RefuseValue(key, known->values(), value);
  }
}

ServiceDialect ReadBase(const Json &root) {
  if (!root.contains(BASE)) {
    return {};
  }
  const std::string wanted = "one of " + DialectNames();
  const std::string &name = RequireText(BASE, wanted, root[BASE]);
  if (!IsDialectName(name)) {
    RefuseValue(BASE, wanted, root[BASE]);
  }
  return GetServiceDialect(name);
}

ServiceDialect ReadDialect(const std::string &text) {
  if (text.size() > MAX_DIALECT_BYTES) {
    throw DialectProblem("is larger than " + std::to_string(MAX_DIALECT_BYTES) + " bytes");
  }
  if (!IsUtf8(text)) {
    throw DialectProblem("is not UTF-8");
  }
  const Json root = ParseWithUniqueKeys(text);
  if (!root.is_object()) {
    throw DialectProblem("must be a JSON object, and is " + Show(root));
  }
  ServiceDialect dialect = ReadBase(root);
  for (const auto &[key, value] : root.items()) {
    if (key != BASE) {
      ReadSwitch(key, value, dialect);
    }
  }
  CheckServiceDialect(dialect);
  return dialect;
}

} // namespace

ServiceDialect ReadDialectFile(const std::string &path) {
  const std::string text = ReadRegularFile(path);
  try {
    return ReadDialect(text);
  } catch (const DialectProblem &problem) {
    throw Tarvel::IOException(path + ": " + problem.what());
  } catch (const Tarvel::InvalidArgumentException &problem) {
    throw Tarvel::IOException(path + ": " + problem.what());
  }
}

std::string WriteDialect(const ServiceDialect &dialect) {
  Json root = Json::object();
  for (const DialectSwitch &known : DialectSwitches()) {
    Json &value = root[std::string(known.name)];
    if (known.jsonType == DialectSwitch::JsonType::FAULTS) {
      value = Json::array();
      for (const FaultName &fault : dialect.credentialFaults) {
        value.push_back({{NAMESPACE, fault.namespaceUri}, {NAME, fault.localName}});
      }
    } else if (known.jsonType == DialectSwitch::JsonType::BOOLEAN) {
      value = known.get(dialect) == "true";
    } else {
      value = known.get(dialect);
    }
  }
  return root.dump(2, ' ', true) + "\n";
}

} // namespace SsoClient::Tool
