// SPDX-License-Identifier: Apache-2.0

#include "proof/http_components.h"

#include "support/throws_message.h"

#include <ssoclient/proof/exceptions.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using namespace SsoClient;

HttpRequest Get(const std::string &uri, std::vector<std::pair<std::string, std::string>> headers = {}) {
  return {"GET", uri, std::move(headers), {}};
}

std::string DerivedOf(const std::string &uri, const std::string &name) {
  const HttpRequest request = Get(uri);
  return HttpComponents(request).FindDerived(name).value_or("(none)");
}

std::string FieldsOf(const std::vector<std::string> &values) {
  HttpRequest request = Get("http://a/");
  for (const std::string &value : values) {
    request.headers.emplace_back("X", value);
  }
  return HttpComponents(request).FindField("x").value_or("(none)");
}

TEST(FindDerived, FollowsTheStandard) {
  const std::string uri = "https://Www.Example:8443/a%2Fb/c?q=1?&r=%20";
  EXPECT_EQ(DerivedOf(uri, "@method"), "GET");
  EXPECT_EQ(DerivedOf(uri, "@target-uri"), uri);
  EXPECT_EQ(DerivedOf(uri, "@scheme"), "https");
  EXPECT_EQ(DerivedOf(uri, "@authority"), "www.example:8443");
  EXPECT_EQ(DerivedOf(uri, "@request-target"), "/a%2Fb/c?q=1?&r=%20");
  EXPECT_EQ(DerivedOf(uri, "@path"), "/a%2Fb/c");
  EXPECT_EQ(DerivedOf(uri, "@query"), "?q=1?&r=%20");
}

TEST(FindDerived, NormalisesWhatIsMissingOrUsual) {
  EXPECT_EQ(DerivedOf("HTTP://A", "@scheme"), "http");
  EXPECT_EQ(DerivedOf("HTTP://A", "@target-uri"), "HTTP://A");
  EXPECT_EQ(DerivedOf("http://A", "@path"), "/");
  EXPECT_EQ(DerivedOf("http://A", "@request-target"), "/");
  EXPECT_EQ(DerivedOf("http://A", "@query"), "?");
  EXPECT_EQ(DerivedOf("http://a?", "@query"), "?");
  EXPECT_EQ(DerivedOf("http://a?", "@request-target"), "/?");
  EXPECT_EQ(DerivedOf("http://a:80/", "@authority"), "a");
  EXPECT_EQ(DerivedOf("http://a:443/", "@authority"), "a:443");
  EXPECT_EQ(DerivedOf("https://a:443/", "@authority"), "a");
  EXPECT_EQ(DerivedOf("https://a:80/", "@authority"), "a:80");
  EXPECT_EQ(DerivedOf("https://[2001:DB8::1]:443/", "@authority"), "[2001:db8::1]");
  EXPECT_EQ(DerivedOf("https://[::1]:8080/", "@authority"), "[::1]:8080");
}

TEST(FindDerived, DoesNotKnowOtherNames) {
  for (const char *const name : {"@", "@status", "@query-param", "@signature-params", "@Method", "method"}) {
    EXPECT_EQ(DerivedOf("http://a/", name), "(none)") << name;
  }
}

TEST(FindField, CombinesFieldsOfOneName) {
  const HttpRequest request = Get("http://a/", {{"B", "1"}, {"a", "2"}, {"b", " 3\t"}, {"Bb", "4"}, {"b", ""}});
  const HttpComponents components(request);
  EXPECT_EQ(components.FindField("b"), "1, 3, ");
  EXPECT_EQ(components.FindField("bb"), "4");
  EXPECT_EQ(components.FindField("c"), std::nullopt);
  EXPECT_EQ(components.CountFields("b"), 3U);
  EXPECT_EQ(components.CountFields("a"), 1U);
  EXPECT_EQ(components.CountFields("c"), 0U);
}

TEST(FindField, KeepsTheOrderOfManyFields) {
  HttpRequest request = Get("http://a/");
  std::string expected;
  for (int i = 0; i < 100; ++i) { // a sort that is not stable may keep the order of a few
    request.headers.emplace_back(i % 2 == 0 ? "b" : "B", std::to_string(i));
    request.headers.emplace_back(i % 3 == 0 ? "a" : "c", "x");
    expected += (i == 0 ? "" : ", ") + std::to_string(i);
  }
  EXPECT_EQ(HttpComponents(request).FindField("b"), expected);
}

TEST(FindField, RemovesBlanksAroundValuesAndUnfoldsLines) {
  EXPECT_EQ(FieldsOf({"  a  b\t "}), "a  b");
  EXPECT_EQ(FieldsOf({"one \t\r\n \t two"}), "one two");
  EXPECT_EQ(FieldsOf({"\r\n a\r\n\tb\r\n "}), "a b");
  EXPECT_EQ(FieldsOf({"a\r\n \r\n b"}), "a b");
  EXPECT_EQ(FieldsOf({" \t "}), "");
}

void ExpectRefusal(const HttpRequest &request, const std::string &message) {
  EXPECT_THROWS_MESSAGE(HttpComponents{request}, InvalidMessageException, message);
}

TEST(HttpComponents, RefusesControlCharactersInFields) {
  for (const std::string value : {"a\r\nb", "a\n b", "a\rb", "a\r\n", "\x7F", "\x1B", "\r\n\r\n a"}) {
    ExpectRefusal(Get("http://a/", {{"X-Y", value}}), "The header field X-Y contains a control character");
  }
  ExpectRefusal(Get("http://a/", {{"X", std::string("a\0b", 3)}}), "The header field X contains a control character");
}

TEST(HttpComponents, RefusesNamesAndMethodsThatAreNotTokens) {
  for (const std::string name : {"", "a b", "a:", "a\n", "\xC3\xA4", "a\"", "@a"}) {
    EXPECT_THROW(HttpComponents{Get("http://a/", {{name, "x"}})}, InvalidMessageException) << name;
  }
  ExpectRefusal(Get("http://a/", {{"a\nb", "x"}}),
                "The request has a header field whose name is not valid: \"a\\u000Ab\"");
  for (const std::string method : {"", "GE T", "GET\n"}) {
    HttpRequest request = Get("http://a/");
    request.method = method;
    EXPECT_THROW(HttpComponents{request}, InvalidMessageException) << method;
  }
  HttpRequest request = Get("http://a/");
  request.method = "GET /";
  ExpectRefusal(request, "The method of the request is not valid: \"GET /\"");
}

TEST(HttpComponents, RefusesATargetThatIsNotAnAbsoluteHttpUri) {
  const std::string prefix = "The target of the request is not valid: Malformed URL ";
  ExpectRefusal(Get(""), prefix + "\"\": it is empty");
  ExpectRefusal(Get("/path"), prefix + "\"/path\": the scheme is not http or https");
  ExpectRefusal(Get("ftp://a/"), prefix + "\"ftp://a/\": the scheme is not http or https");
  ExpectRefusal(Get("http://u@a/"), prefix + "\"http://***@a/\": it contains user information");
  ExpectRefusal(Get("http://a/ b"), prefix + "\"http://a/ b\": it contains a character that is not allowed in a URL");
  ExpectRefusal(Get("http://a/#b"), "The target of the request has a fragment: \"http://a/#b\"");
  ExpectRefusal(Get("http://a/b#"), "The target of the request has a fragment: \"http://a/b#\"");
}

TEST(HttpComponents, AcceptsAHeaderAtTheLimitOnly) {
  HttpRequest request = Get("http://a/", {{"A", std::string(MAX_HTTP_HEADER_OCTETS - 1, 'x')}});
  EXPECT_EQ(HttpComponents(request).FindField("a")->size(), MAX_HTTP_HEADER_OCTETS - 1);
  request.headers.emplace_back("B", "");
  ExpectRefusal(request, "The header fields of the request have more than 1048576 octets");
}

TEST(HttpComponents, RefusesAHostileHeaderInLinearTime) {
  ExpectRefusal(Get("http://a/", {{"A", std::string(16 << 20, '\r')}}),
                "The header fields of the request have more than 1048576 octets");
  HttpRequest many = Get("http://a/");
  for (std::size_t i = 0; i < MAX_HTTP_HEADER_OCTETS; ++i) {
    many.headers.emplace_back("a", "");
  }
  EXPECT_EQ(HttpComponents(many).CountFields("a"), MAX_HTTP_HEADER_OCTETS);
  std::string folds;
  while (folds.size() < MAX_HTTP_HEADER_OCTETS - 8) {
    folds += "\r\n ";
  }
  EXPECT_EQ(FieldsOf({folds}), "");
}

} // namespace
