// SPDX-License-Identifier: Apache-2.0
/// @file
/// The options of a command line for a SOAP message: its header blocks and its receiver.

#pragma once

#include "exit_code.h"

#include <ssoclient/proof/message_part.h>
#include <tarvel/xml/parser.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace SsoClient::Tool {

struct MessagePartsOptions {
  std::vector<std::string> parts;
  std::string actor;
};

/// Adds --part, with this help, and --actor.
void AddMessagePartsOptions(CLI::App &app, MessagePartsOptions &options, const std::string &partHelp);

/// Adds the argument FILE, a SOAP message.
void AddMessageArgument(CLI::App &app, std::string &file);

/// The names of header blocks such as "{http://www.w3.org/2005/08/addressing}To", or "To" without a namespace.
/// @throws UsageException for a text of another form.
std::vector<MessagePart> ParseParts(const std::vector<std::string> &texts);

/// The actor; `boost::none` when none is given.
boost::optional<std::string> ActorOf(const MessagePartsOptions &options);

/// Returns what `call` returns, which reads the text of a message. A text that is not well-formed is an invalid message,
/// and not an invalid token.
template <typename Call>
auto ReadAsMessage(const Call &call) {
  try {
    return call();
  } catch (const Tarvel::Xml::XMLParseException &failure) {
    throw RelabelledException(failure, "message invalid");
  }
}

} // namespace SsoClient::Tool
