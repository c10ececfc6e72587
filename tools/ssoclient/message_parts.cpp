// SPDX-License-Identifier: Apache-2.0

#include "message_parts.h"

#include "option.h"

namespace SsoClient::Tool {
namespace {

constexpr const char *BRACES = "{}";

MessagePart ParsePart(const std::string &text) {
  const bool hasNamespace = !text.empty() && text.front() == '{';
  const std::size_t end = hasNamespace ? text.find('}') : 0;
  if (end == std::string::npos) {
    throw UsageException("--part must be {NAMESPACE}NAME, and '" + text + "' has no closing brace");
  }
  MessagePart part;
  part.namespaceUri = hasNamespace ? text.substr(1, end - 1) : "";
  part.localName = hasNamespace ? text.substr(end + 1) : text;
  if (part.localName.empty() || part.localName.find_first_of(BRACES) != std::string::npos) {
    throw UsageException("--part must be {NAMESPACE}NAME, which '" + text + "' is not");
  }
  return part;
}

} // namespace

void AddMessagePartsOptions(CLI::App &app, MessagePartsOptions &options, const std::string &partHelp) {
  constexpr const char *GROUP = "Message";
  AddOption(app, "--part", options.parts, partHelp).TypeName("{URI}NAME").Group(GROUP);
  AddOption(app, "--actor", options.actor,
            "The actor (SOAP 1.1) or role (SOAP 1.2) whose security header it is; by default, the last receiver")
      .TypeName("URI")
      .Group(GROUP);
}

void AddMessageArgument(CLI::App &app, std::string &file) {
  AddOption(app, "FILE", file, "The SOAP message, an XML file; \"-\" is standard input").Required().TypeName("");
}

std::vector<MessagePart> ParseParts(const std::vector<std::string> &texts) {
  std::vector<MessagePart> parts;
  parts.reserve(texts.size());
  for (const std::string &text : texts) {
    parts.push_back(ParsePart(text));
  }
  return parts;
}

boost::optional<std::string> ActorOf(const MessagePartsOptions &options) {
  return options.actor.empty() ? boost::none : boost::make_optional(options.actor);
}

} // namespace SsoClient::Tool
