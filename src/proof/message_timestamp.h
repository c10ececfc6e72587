// SPDX-License-Identifier: Apache-2.0
/// @file
/// The timestamp of a message (WS-Security 1.1, section 10).

#pragma once

#include "proof/message_sinks.h"
#include "proof/time_window.h"

#include <tarvel/system/date_time.h>
#include <tarvel/xml/node.h>

#include <boost/optional.hpp>

namespace SsoClient {

/// A `wsu:Timestamp` that was read. After a deviation, a date that could not be read is not set.
struct MessageTimestamp {
  const Tarvel::Xml::ElementNode *element = nullptr;        ///< null if there is none
  const Tarvel::Xml::ElementNode *createdElement = nullptr; ///< the first `wsu:Created`; may be null
  const Tarvel::Xml::ElementNode *expiresElement = nullptr; ///< the first `wsu:Expires`; may be null
  boost::optional<Tarvel::System::DateTime> created;        ///< always set in a timestamp without deviation
  boost::optional<Tarvel::System::DateTime> expires;
};

/// Reads the timestamp that is a child of `security`. It must have a creation time, may have an end, which must be later, and
/// must have nothing else. Texts with a comment in them are refused, because a comment could cut off a part of them.
MessageTimestamp ReadTimestamp(const Tarvel::Xml::ElementNode &security, bool isRequired, DeviationSink &sink);

/// Checks what could be read of `timestamp` against this machine's clock.
void CheckTime(const MessageTimestamp &timestamp, const TimeWindow &window, DeviationSink &sink);

} // namespace SsoClient
