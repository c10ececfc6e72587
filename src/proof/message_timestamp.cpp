// SPDX-License-Identifier: Apache-2.0

#include "proof/message_timestamp.h"

#include "model/namespaces.h"
#include "proof/soap_parts.h"
#include "xml/date_time_text.h"
#include "xml/form_text.h"
#include "xml/node_filter_iterator.h"
#include "xml/refuse.h"
#include "xml/strict_checks.h"

#include <memory>
#include <string>

namespace SsoClient {

namespace {

using Tarvel::System::DateTime;
using Tarvel::Xml::ElementNode;

bool IsUtilityElement(const NodeFilterIterator &iterator, std::string_view localName) {
  const ElementNode *const element = IteratorToElement(iterator);
  return element && element->HasQName(Namespaces::WSU, localName);
}

/// Reads a date element into `element` and `date`, which an earlier element of the same name may have set.
void ReadDate(const NodeFilterIterator &iterator, const ElementNode *&element, boost::optional<DateTime> &date,
              DeviationSink &sink) {
  const ElementNode &found = *IteratorToElement(iterator);
  if (element) {
    Refuse(sink, found, "one", "two", "The timestamp has two elements %1", found.GetLocalName());
    return;
  }
  element = &found;
  std::string text;
  DateTime read;
  if (!RequireTextualContent(iterator, text, sink)) {
    return;
  }
  if (!DateTime::TryParse(text, read)) {
    Refuse(sink, found, "a date of the form xsd:dateTime", text, "The %1 of the timestamp is not a date",
           found.GetLocalName());
    return;
  }
  date = read;
}

void ReadDates(const NodeFilterIterator &iterator, MessageTimestamp &timestamp, DeviationSink &sink) {
  for (NodeFilterIterator child = iterator.GetChild(); child.node; child.MoveToSibling()) {
    if (IsUtilityElement(child, "Created")) {
      ReadDate(child, timestamp.createdElement, timestamp.created, sink);
    } else if (IsUtilityElement(child, "Expires")) {
      ReadDate(child, timestamp.expiresElement, timestamp.expires, sink);
    } else {
      Refuse(sink, child, "wsu:Created and wsu:Expires", WhatIsAt{child.node},
             "The timestamp has content other than Created and Expires");
    }
  }
}

} // namespace

MessageTimestamp ReadTimestamp(const ElementNode &security, bool isRequired, DeviationSink &sink) {
  MessageTimestamp timestamp;
  const FoundElements found = FindChildren(&security, Namespaces::WSU, "Timestamp");
  timestamp.element = found.first;
  if (found.second) {
    Refuse(sink, *found.second, "one timestamp", "two", "The security header has two timestamps");
  }
  if (!found.first) {
    if (isRequired) {
      Refuse(sink, security, "a timestamp", "", "The security header has no timestamp");
    }
    return timestamp;
  }
  const SkipWsAndCommentsFilter filter;
  ReadDates(NodeFilterIterator(found.first, std::shared_ptr<const NodeFilter>(std::shared_ptr<void>(), &filter)),
            timestamp, sink);
  if (!timestamp.createdElement) {
    Refuse(sink, *found.first, "wsu:Created", "", "The timestamp has no Created");
  }
  if (timestamp.created && timestamp.expires && !(*timestamp.created < *timestamp.expires)) {
    Refuse(sink, *timestamp.expiresElement, "after " + DateTimeFormatter(*timestamp.created),
           DateTimeFormatter(*timestamp.expires), "The timestamp expires before it is created");
  }
  return timestamp;
}

void CheckTime(const MessageTimestamp &timestamp, const TimeWindow &window, DeviationSink &sink) {
  const DateTime now = Tarvel::System::GetUtcDateTime();
  if (timestamp.created) {
    CheckCreation(*timestamp.created, window, now, timestamp.createdElement, sink);
  }
  if (timestamp.expires) {
    CheckExpiry(*timestamp.expires, window, now, timestamp.expiresElement, sink);
  }
}

} // namespace SsoClient
