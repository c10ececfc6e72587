// SPDX-License-Identifier: Apache-2.0

#include "compose/soap_envelope.h"

#include "unit/compose/wire_uris.h"

#include <gtest/gtest.h>

namespace SsoClient {
namespace {

using namespace Testing;

const std::string ENVELOPE = "<soapenv:Envelope" + Declare("soapenv", SOAPENV_URI) + ">";
const std::string BODY = "<soapenv:Body" + Declare("wst", WST_URI) + ">";

TEST(SoapBuilder, WrapsHeaderAndBodyAndDeclaresWsTrustOnTheBodyEvenIfItsContentDoes) {
  EXPECT_EQ(SerializeToXML(SoapBuilder(ElementBuilder("h", "H"), ElementBuilder("wst", "B", {{"xmlns:wst", WST_URI}}))),
            ENVELOPE + "<soapenv:Header><h:H></h:H></soapenv:Header>" + BODY + "<wst:B" + Declare("wst", WST_URI) +
                "></wst:B></soapenv:Body></soapenv:Envelope>");
}

TEST(SoapBuilder, LeavesTheElementOfANullPartEmpty) {
  EXPECT_EQ(SerializeToXML(SoapBuilder(nullptr, nullptr)),
            ENVELOPE + "<soapenv:Header></soapenv:Header>" + BODY + "</soapenv:Body></soapenv:Envelope>");
}

} // namespace
} // namespace SsoClient
