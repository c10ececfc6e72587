// SPDX-License-Identifier: Apache-2.0

#include "comparison.h"

#include "readers.h"

#include <algorithm>
#include <cstdio>

namespace Testing {

namespace {

const char *NameOf(Peer peer) {
  switch (peer) {
  case Peer::LIBXML2:
    return "libxml2";
  case Peer::EXPAT:
    return "expat";
  case Peer::EXPAT_WITH_NAMESPACES:
    return "expat with namespaces";
  }
  return "";
}

std::string Describe(const Reading &reading, const std::string &events) {
  if (reading.hasDocumentType) {
    return "accepts up to a document type declaration";
  }
  if (reading.isAccepted) {
    return "accepts as " + Escaped(events);
  }
  return "refuses (" + std::to_string(reading.code) + ", line " + std::to_string(reading.line) + ", offset " +
         std::to_string(static_cast<std::ptrdiff_t>(reading.offset)) + "): " + Escaped(reading.message);
}

bool IsAlike(const Reading &ours, const Reading &theirs, const EventText Reading::*events) {
  if (theirs.hasDocumentType || theirs.isAccepted != ours.isAccepted) {
    return false;
  }
  return !ours.isAccepted || (theirs.*events).Get() == (ours.*events).Get();
}

std::string Join(const std::vector<std::size_t> &numbers) {
  std::string joined;
  for (const std::size_t number : numbers) {
    joined += " " + std::to_string(number);
  }
  return joined;
}

void Explain(Peer peer, const Difference &difference, const EventText Reading::*events, Comparison &comparison) {
  const std::vector<DifferenceRule> &rules = DifferenceRules();
  const auto rule = std::find_if(rules.begin(), rules.end(), [&](const DifferenceRule &candidate) {
    return (candidate.peers & static_cast<unsigned>(peer)) != 0 && candidate.applies(difference);
  });
  if (rule != rules.end()) {
    comparison.rules.push_back({static_cast<std::size_t>(rule - rules.begin()), peer});
    return;
  }
  const Reading &ours = difference.ours;
  const Reading &theirs = difference.theirs;
  comparison.unexplained += std::string(NameOf(peer)) + " " + Describe(theirs, (theirs.*events).Get()) +
                            "\n    where the platform " + Describe(ours, (ours.*events).Get()) + "\n    " +
                            Escaped(difference.document) + "\n";
}

} // namespace

Comparison Compare(std::string_view document) {
  Comparison comparison;
  comparison.ours = ReadWithPlatform(document);
  const Reading &ours = comparison.ours;
  const Reading libxml2 = ReadWithLibxml2(document);
  const Reading expat = ReadWithExpat(document);
  const Reading expatWithNamespaces = ReadWithNamespacesOfExpat(document);
  const auto compareWith = [&](Peer peer, const Reading &theirs, const EventText Reading::*events) {
    if (!IsAlike(ours, theirs, events)) {
      Explain(peer, {document, ours, theirs, libxml2, expat}, events, comparison);
    }
  };
  compareWith(Peer::LIBXML2, libxml2, &Reading::declarationsFirst);
  compareWith(Peer::EXPAT, expat, &Reading::events);
  if (ours.isAccepted && expat.isAccepted && ours.offsets != expat.offsets) {
    comparison.unexplained += "expat finds elements at" + Join(expat.offsets) + "\n    where the platform has them at" +
                              Join(ours.offsets) + "\n    " + Escaped(document) + "\n";
  }
  compareWith(Peer::EXPAT_WITH_NAMESPACES, expatWithNamespaces, &Reading::declarationsFirst);
  return comparison;
}

std::string Escaped(std::string_view text) {
  std::string escaped;
  for (const char character : text) {
    if (character >= 0x20 && character < 0x7F && character != '\\') {
      escaped += character;
      continue;
    }
    char code[8];
    std::snprintf(code, sizeof code, "\\x%02X", static_cast<unsigned>(static_cast<unsigned char>(character)));
    escaped += code;
  }
  return escaped;
}

} // namespace Testing
