// SPDX-License-Identifier: Apache-2.0
/// @file
/// The header elements of WS-Addressing 1.0.

#pragma once

#include "compose/xml_builder.h"

#include <string>
#include <vector>

namespace SsoClient {

/// `wsa:To`, `wsa:Action`, `wsa:MessageID` with a new UUID, and `wsa:ReplyTo`, which states that the reply is the HTTP
/// response. None of them has `mustUnderstand`.
/// @param to the address of the service
/// @param action the action of the request
std::vector<XMLBuilderPtr> WsAddressingHeaderBuilders(const std::string &to, const std::string &action);

} // namespace SsoClient
