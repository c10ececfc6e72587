// SPDX-License-Identifier: Apache-2.0
/// @file
/// The events of an operation, as lines on standard error.

#pragma once

#include "output.h"

#include <ssoclient/operation_observer.h>

#include <memory>
#include <string>

namespace SsoClient::Tool {

/// Each event as one line, not yet made printable.
std::string EventText(const OperationInfo &operation);
std::string EventText(const RequestSentEvent &event);
std::string EventText(const ResponseReceivedEvent &event);
std::string EventText(const FaultEvent &event);
std::string EventText(const OperationEndedEvent &event);

/// An observer that writes each event to standard error; null unless the output is verbose.
std::shared_ptr<OperationObserver> ObserverFor(const OutputOptions &output);

} // namespace SsoClient::Tool
