// SPDX-License-Identifier: Apache-2.0

#include "doctor_network.h"
#include "doctor_texts.h"

#include <gtest/gtest.h>

namespace SsoClient::Tool {
namespace {

using Tarvel::Ssl::AddressProbe;
using Tarvel::Ssl::ServerProbe;
using Outcome = AddressProbe::Outcome;

const DoctorTarget TARGET{true, "sts.corp.example", 443, "/sts"};

AddressProbe AddressOf(const std::string &address, Outcome outcome, const std::string &reason = "") {
  AddressProbe probe;
  probe.address = address;
  probe.outcome = outcome;
  probe.reason = reason;
  probe.durationMicroseconds = 2999;
  return probe;
}

ServerProbe ProbeOf(const std::vector<AddressProbe> &addresses) {
  ServerProbe probe;
  probe.addresses = addresses;
  probe.addressCount = addresses.size();
  probe.lookupMicroseconds = 7000;
  return probe;
}

const AddressProbe SILENT = AddressOf("192.0.2.1", Outcome::TIMED_OUT, "there was no answer in time");
const AddressProbe CLOSED = AddressOf("192.0.2.2", Outcome::REFUSED, "Connection refused");
const AddressProbe OPEN = AddressOf("2001:db8::1", Outcome::ANSWERED);

TEST(CheckAddress, ListsTheAddressesAndTheTime) {
  EXPECT_EQ("address       fine      sts.corp.example, port 443: 192.0.2.1, 2001:db8::1 (7 ms).\n",
            TextOf(CheckAddress(TARGET, ProbeOf({SILENT, OPEN}))));
}

TEST(CheckAddress, CountsTheAddressesThatAreNotTried) {
  ServerProbe probe = ProbeOf({OPEN});
  probe.addressCount = 5;
  EXPECT_EQ("address       fine      sts.corp.example, port 443: 2001:db8::1, and 4 more that are not tried (7 ms).\n",
            TextOf(CheckAddress(TARGET, probe)));
}

TEST(CheckAddress, FailsForANameWithoutAddress) {
  ServerProbe probe = ProbeOf({});
  probe.lookupFailure = "Name or service not known";
  const DoctorCheck check = CheckAddress(TARGET, probe);
  EXPECT_EQ("address       failed    sts.corp.example has no address: Name or service not known (7 ms).\n"
            "              to do     Correct the name in --sts, or this machine's look-up of names.\n",
            TextOf(check));
  EXPECT_EQ(ExitCode::COMMUNICATION, check.exitCode);
}

TEST(CheckAddress, HasItsFactsInJson) {
  EXPECT_EQ(R"({"name":"address","outcome":"fine","found":"sts.corp.example, port 443: 2001:db8::1 (7 ms).",)"
            R"("todo":null,"host":"sts.corp.example","port":443,"path":"/sts","addresses":["2001:db8::1"],)"
            R"("addressCount":1,"durationMs":7})",
            JsonOf(CheckAddress(TARGET, ProbeOf({OPEN}))).dump());
}

TEST(CheckTcp, IsFineWhenEachAddressAnswers) {
  EXPECT_EQ("tcp           fine      2001:db8::1 answers (2 ms).\n", TextOf(CheckTcp(TARGET, ProbeOf({OPEN}))));
}

TEST(CheckTcp, WarnsOfAnAddressThatDoesNotAnswer) {
  EXPECT_EQ(
      "tcp           warning   192.0.2.1: there was no answer in time (2 ms).\n"
      "                        2001:db8::1 answers (2 ms).\n"
      "              to do     Connections try the addresses in this order, and one that is silent delays each of "
      "them. Make all of them answer at port 443, or remove the others from the name.\n",
      TextOf(CheckTcp(TARGET, ProbeOf({SILENT, OPEN}))));
  EXPECT_EQ(CheckOutcome::WARNING, CheckTcp(TARGET, ProbeOf({OPEN, CLOSED})).outcome);
}

TEST(CheckTcp, FailsWhenNoAddressAnswers) {
  const DoctorCheck check = CheckTcp(TARGET, ProbeOf({CLOSED, SILENT}));
  EXPECT_EQ(
      "tcp           failed    192.0.2.2: Connection refused (2 ms).\n"
      "                        192.0.2.1: there was no answer in time (2 ms).\n"
      "              to do     No program listens at that port. Start the service, or correct the port in --sts.\n",
      TextOf(check));
  EXPECT_EQ(ExitCode::COMMUNICATION, check.exitCode);
}

TEST(CheckTcp, ShowsWhatToDoAboutEachKindOfFailure) {
  EXPECT_EQ(
      std::vector<std::string>{"A firewall may drop the packets, or no machine has the address. Open the port, or "
                               "correct --sts."},
      CheckTcp(TARGET, ProbeOf({SILENT})).todo);
  EXPECT_EQ(std::vector<std::string>{"Correct this machine's network, or the address in --sts."},
            CheckTcp(TARGET, ProbeOf({AddressOf("192.0.2.3", Outcome::FAILED, "Network is unreachable")})).todo);
}

TEST(CheckTcp, IsNotDoneWithoutAnAddress) {
  EXPECT_EQ("tcp           not done  No address is known.\n", TextOf(CheckTcp(TARGET, ProbeOf({}))));
}

TEST(CheckTcp, HasItsFactsInJson) {
  EXPECT_EQ(R"([{"address":"192.0.2.2","outcome":"refused","reason":"Connection refused","durationMs":2},)"
            R"({"address":"192.0.2.1","outcome":"timed out","reason":"there was no answer in time","durationMs":2},)"
            R"({"address":"2001:db8::1","outcome":"answered","reason":null,"durationMs":2}])",
            JsonOf(CheckTcp(TARGET, ProbeOf({CLOSED, SILENT, OPEN}))).at("attempts").dump());
}

} // namespace
} // namespace SsoClient::Tool
