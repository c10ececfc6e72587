// SPDX-License-Identifier: Apache-2.0

#include "unit/token/assertion_refusals.h"
#include "unit/token/assertion_text.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <string>

namespace {

using namespace Testing;

const std::string UNKNOWN_RESTRICTION = "Unknown or duplicate restriction node under Conditions";

TEST(AssertionRefusals, Conditions) {
  const std::string from = " NotBefore=\"2026-01-01T00:00:00Z\"";
  const std::string to = " NotOnOrAfter=\"2026-01-01T07:00:00Z\"";
  const std::string missing = "Node 'saml:Conditions is missing required attribute '";
  ExpectRefusals(BearerAssertion(),
                 {
                     {from, "", missing + "NotBefore'"},
                     {to, "", missing + "NotOnOrAfter'"},
                     {to, to + " Extra=\"\"", "Unexpected attributes on element 'saml:Conditions'"},
                     {from, " NotBefore=\"2026-02-30T00:00:00Z\"", "saml:Conditions/@NotBefore is not a date"},
                     {to, " NotOnOrAfter=\"2026-01-01\"", "saml:Conditions/@NotOnOrAfter is not a date"},
                     {"<saml:Conditions ", "<saml:Conditions xmlns:saml=\"urn:other\" ",
                      "Element 'saml:Conditions' has unexpected namespace"},
                 });
}

TEST(AssertionRefusals, UnknownAndDuplicateRestrictions) {
  const std::string proxy = Piece::PROXY_RESTRICTION;
  const std::string renew = Piece::RENEW_RESTRICTION;
  ExpectRefusals(BearerAssertion(),
                 {
                     {proxy, Twice(proxy), UNKNOWN_RESTRICTION + ": saml:ProxyRestriction"},
                     {renew, Twice(renew), UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {Piece::DelegationRestriction(), Twice(Piece::DelegationRestriction()),
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {Piece::AudienceRestriction(), Twice(Piece::AudienceRestriction()),
                      UNKNOWN_RESTRICTION + ": saml:AudienceRestriction"},
                     {proxy, "<saml:OneTimeUse/>", UNKNOWN_RESTRICTION + ": saml:OneTimeUse"},
                     {proxy, "<ProxyRestriction/>", UNKNOWN_RESTRICTION + ": ProxyRestriction"},
                     {proxy, "<saml:Condition/>", UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:Condition xsi:type=\"rsa:RenewRestrictionType\"",
                      "<saml:Condition xmlns:saml=\"urn:other\" xsi:type=\"rsa:RenewRestrictionType\"",
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:Condition xsi:type=\"del:DelegationRestrictionType\"",
                      "<saml:Condition xmlns:saml=\"urn:other\" xsi:type=\"del:DelegationRestrictionType\"",
                      UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {"<saml:AudienceRestriction>", "<saml:AudienceRestriction xmlns:saml=\"urn:other\">",
                      UNKNOWN_RESTRICTION + ": saml:AudienceRestriction"},
                     {"<saml:ProxyRestriction ", "<saml:ProxyRestriction xmlns:saml=\"urn:other\" ",
                      UNKNOWN_RESTRICTION + ": saml:ProxyRestriction"},
                     {proxy, "<saml:Condition xsi:type=\"rsa:OtherType\"/>", UNKNOWN_RESTRICTION + ": saml:Condition"},
                     {proxy, "text", UNKNOWN_RESTRICTION},
                     {proxy, "<?pi?>", UNKNOWN_RESTRICTION},
                 });
}

TEST(AssertionRefusals, ConditionWhoseTypeUsesAnUndefinedPrefix) {
  const std::string base = BearerAssertion();
  const std::size_t column = base.find("<saml:ProxyRestriction") + 1;
  ExpectRefusals(base, {{Piece::PROXY_RESTRICTION, "<saml:Condition xsi:type=\"p:T\"/>",
                         "Element saml:Conditionat 1," + std::to_string(column) + " uses undefined prefix: `p'"}});
}

TEST(AssertionRefusals, DelegationRestriction) {
  const std::string type = "xsi:type=\"del:DelegationRestrictionType\"";
  const std::string first = "<del:Delegate DelegationInstant=\"2026-01-01T00:00:01Z\">";
  const std::string name = "<saml:NameID Format=\"urn:format:last\">backup@corp</saml:NameID>";
  ExpectRefusals(BearerAssertion(),
                 {
                     {type, type + " Count=\"1\"", "Unexpected attribute 'Count' on element 'saml:Condition'"},
                     {Piece::DELEGATES, "", NotFound("Delegate")},
                     {Piece::DELEGATES, std::string(Piece::DELEGATES) + "<del:Other/>", NotFound("Delegate")},
                     {Piece::DELEGATES, std::string(Piece::DELEGATES) + "text", NotFound("Delegate")},
                     {first, "<del:Delegate xmlns:del=\"urn:other\" DelegationInstant=\"2026-01-01T00:00:01Z\">",
                      "Element 'del:Delegate' has unexpected namespace"},
                     {first, "<del:Delegate>", "Node 'del:Delegate is missing required attribute 'DelegationInstant'"},
                     {first, "<del:Delegate DelegationInstant=\"\">", "del:Delegate/@DelegationInstant is not a date"},
                     {first, "<del:Delegate ConfirmationMethod=\"\" DelegationInstant=\"2026-01-01T00:00:01Z\">",
                      "Unexpected attributes on element 'del:Delegate'"},
                     {name, "", NotFound("NameID")},
                     {name, Twice(name), "Unexpected elements after Delegate/NameID"},
                     {" Format=\"urn:format:last\"", "", "Node 'saml:NameID is missing required attribute 'Format'"},
                 });
}

TEST(AssertionRefusals, AudienceRestriction) {
  const std::string start = "<saml:AudienceRestriction>";
  ExpectRefusals(
      BearerAssertion(),
      {
          {start, "<saml:AudienceRestriction ID=\"\">", "Unexpected attributes on element 'saml:AudienceRestriction'"},
          {Piece::AUDIENCES, "", NotFound("Audience")},
          {start, start + "<saml:Other/>", NotFound("Audience")},
          {start, start + "<Audience>x</Audience>", "Element 'Audience' has unexpected namespace"},
          {start, start + "<saml:Audience/>", OnlyText("saml:Audience")},
          {start, start + "<saml:Audience ID=\"\">x</saml:Audience>",
           "Unexpected attributes on element 'saml:Audience'"},
      });
}

TEST(AssertionRefusals, ProxyAndRenewRestriction) {
  const std::string proxy = Piece::PROXY_RESTRICTION;
  const std::string renew = Piece::RENEW_RESTRICTION;
  ExpectRefusals(
      BearerAssertion(),
      {
          {proxy, "<saml:ProxyRestriction Count=\"-1\"/>",
           "saml:ProxyRestriction/@Count is not a non-negative integer."},
          {proxy, "<saml:ProxyRestriction Count=\"\"/>", "saml:ProxyRestriction/@Count is not a non-negative integer."},
          {proxy, "<saml:ProxyRestriction Extra=\"\"/>", "Unexpected attributes on element 'saml:ProxyRestriction'"},
          {proxy, "<saml:ProxyRestriction><saml:Audience>x</saml:Audience></saml:ProxyRestriction>",
           "Element 'saml:ProxyRestriction' must be empty"},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Count=\"many\"/>",
           "saml:Condition/@Count is not a non-negative integer."},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\" Extra=\"\"/>",
           "Unexpected attribute 'Extra' on element 'saml:Condition'"},
          {renew, "<saml:Condition xsi:type=\"rsa:RenewRestrictionType\">text</saml:Condition>",
           "Element 'saml:Condition' must be empty"},
      });
}

} // namespace
