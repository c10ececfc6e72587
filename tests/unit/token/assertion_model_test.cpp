// SPDX-License-Identifier: Apache-2.0
// The records of an assertion: aggregates, whose fields are in the order of the elements and attributes that they come from.
#include "token/assertion_model.h"

#include "support/declared_order.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <type_traits>
#include <vector>

namespace {

using namespace SsoClient;
using Testing::OffsetsIn;

template <typename... Records>
constexpr bool ARE_AGGREGATES = (std::is_aggregate_v<Records> && ...);
static_assert(ARE_AGGREGATES<NameIDType, SubjectConfirmationDataType, SubjectConfirmationType, SubjectType,
                             RenewRestrictionType, ProxyRestrictionType, DelegateType, DelegationRestrictionType,
                             AudienceRestrictionType, ConditionsType, AdviceType, AuthnContextType, AuthnStatementType,
                             AttributeType, AttributeStatementType, SamlAssertionType>);

void ExpectDeclaredOrder(const std::vector<std::ptrdiff_t> &offsets) {
  EXPECT_EQ(0, offsets.front());
  EXPECT_TRUE(std::is_sorted(offsets.begin(), offsets.end(), std::less_equal<>())) << ::testing::PrintToString(offsets);
}

TEST(AssertionModel, DeclaresTheFieldsOfTheAssertionInOrder) {
  const SamlAssertionType all;
  ExpectDeclaredOrder(OffsetsIn(all, all.Version, all.ID, all.IssueInstant, all.Issuer, all.Signature, all.Subject,
                                all.Conditions, all.Advice, all.AuthnStatement, all.AttributeStatement));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheSubjectInOrder) {
  const SubjectType subject;
  ExpectDeclaredOrder(OffsetsIn(subject, subject.NameID, subject.SubjectConfirmation));
  ExpectDeclaredOrder(OffsetsIn(subject.NameID, subject.NameID.Format, subject.NameID.value));
  const SubjectConfirmationType &confirmation = subject.SubjectConfirmation;
  ExpectDeclaredOrder(
      OffsetsIn(confirmation, confirmation.Method, confirmation.NameID, confirmation.SubjectConfirmationData));
  const SubjectConfirmationDataType &data = confirmation.SubjectConfirmationData;
  ExpectDeclaredOrder(OffsetsIn(data, data.NotOnOrAfter, data.certificate));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheConditionsInOrder) {
  const ConditionsType conditions;
  ExpectDeclaredOrder(OffsetsIn(conditions, conditions.NotBefore, conditions.NotOnOrAfter, conditions.RenewRestriction,
                                conditions.DelegationRestriction, conditions.AudienceRestriction,
                                conditions.ProxyRestriction));
  const DelegateType delegate;
  ExpectDeclaredOrder(OffsetsIn(delegate, delegate.DelegationInstant, delegate.NameID));
}

TEST(AssertionModel, DeclaresTheFieldsOfTheStatementsInOrder) {
  const AuthnStatementType statement;
  ExpectDeclaredOrder(OffsetsIn(statement, statement.AuthnInstant, statement.AuthnContext));
  const AttributeType attribute;
  ExpectDeclaredOrder(
      OffsetsIn(attribute, attribute.Name, attribute.NameFormat, attribute.FriendlyName, attribute.values));
}

} // namespace
