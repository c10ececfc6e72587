// SPDX-License-Identifier: Apache-2.0

#include "doctor_network.h"

#include <algorithm>

namespace SsoClient::Tool {
namespace {

using Json = nlohmann::ordered_json;
using Tarvel::Ssl::AddressProbe;
using Tarvel::Ssl::ServerProbe;
using Outcome = AddressProbe::Outcome;

const char *TextOf(Outcome outcome) {
  switch (outcome) {
  case Outcome::ANSWERED:
    return "answered";
  case Outcome::REFUSED:
    return "refused";
  case Outcome::TIMED_OUT:
    return "timed out";
  case Outcome::FAILED:
    break;
  }
  return "failed";
}

/// What to do when no address answers, and the attempt to reach the first one had this outcome.
const char *AdviceFor(Outcome outcome) {
  switch (outcome) {
  case Outcome::REFUSED:
    return "No program listens at that port. Start the service, or correct the port in --sts.";
  case Outcome::TIMED_OUT:
    return "A firewall may drop the packets, or no machine has the address. Open the port, or correct --sts.";
  case Outcome::ANSWERED:
  case Outcome::FAILED:
    break;
  }
  return "Correct this machine's network, or the address in --sts.";
}

bool HasAnswered(const AddressProbe &address) {
  return address.outcome == Outcome::ANSWERED;
}

std::string DescribeAttempt(const AddressProbe &address) {
  return address.address + (HasAnswered(address) ? " answers " : ": " + Shown(address.reason) + " ") +
         DurationText(address.durationMicroseconds) + ".";
}

Json AttemptJson(const AddressProbe &address) {
  return {{"address", address.address},
          {"outcome", TextOf(address.outcome)},
          {"reason", address.reason.empty() ? Json(nullptr) : Json(Shown(address.reason))},
          {"durationMs", Milliseconds(address.durationMicroseconds)}};
}

} // namespace

bool IsConnected(const ServerProbe &probe) {
  return std::any_of(probe.addresses.begin(), probe.addresses.end(), HasAnswered);
}

DoctorCheck CheckAddress(const DoctorTarget &target, const ServerProbe &probe) {
  DoctorCheck check("address");
  std::vector<std::string> addresses;
  for (const AddressProbe &address : probe.addresses) {
    addresses.push_back(address.address);
  }
  check.facts = {{"host", Shown(target.host)},         {"port", target.port},
                 {"path", Shown(target.path)},         {"addresses", addresses},
                 {"addressCount", probe.addressCount}, {"durationMs", Milliseconds(probe.lookupMicroseconds)}};
  const std::string duration = DurationText(probe.lookupMicroseconds);
  if (!probe.lookupFailure.empty()) {
    check.found.push_back(Shown(target.host) + " has no address: " + Shown(probe.lookupFailure) + " " + duration + ".");
    check.Fail(ExitCode::COMMUNICATION, "Correct the name in --sts, or this machine's look-up of names.");
    return check;
  }
  const std::size_t more = probe.addressCount - addresses.size();
  check.found.push_back(Shown(target.host) + ", port " + std::to_string(target.port) + ": " + JoinTexts(addresses) +
                        (more > 0 ? ", and " + std::to_string(more) + " more that are not tried " : " ") + duration +
                        ".");
  return check;
}

DoctorCheck CheckTcp(const DoctorTarget &target, const ServerProbe &probe) {
  DoctorCheck check("tcp");
  check.facts = {{"attempts", Json::array()}};
  if (probe.addresses.empty()) {
    check.Skip("No address is known.");
    return check;
  }
  for (const AddressProbe &address : probe.addresses) {
    check.found.push_back(DescribeAttempt(address));
    check.facts["attempts"].push_back(AttemptJson(address));
  }
  if (!IsConnected(probe)) {
    check.Fail(ExitCode::COMMUNICATION, AdviceFor(probe.addresses.front().outcome));
  } else if (!std::all_of(probe.addresses.begin(), probe.addresses.end(), HasAnswered)) {
    check.Warn(
        "Connections try the addresses in this order, and one that is silent delays each of them. Make all of them "
        "answer at port " +
        std::to_string(target.port) + ", or remove the others from the name.");
  }
  return check;
}

} // namespace SsoClient::Tool
