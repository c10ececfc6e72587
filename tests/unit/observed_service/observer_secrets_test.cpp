// SPDX-License-Identifier: Apache-2.0
// No event and no log line contains the password, the token or a signature value of an operation: for everything that
// the service can repeat, for each way in which the operation can fail, and at every level of the log.
#include "unit/observed_service/observed_operations.h"

#include "support/recorded_log.h"
#include "support/throws_message.h"
#include "support/token_stand_in.h"

#include <ssoclient/exceptions.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>

namespace SsoClient {
namespace {

using namespace Testing;
using Texts = std::vector<std::string>;

std::string Base64(const std::string &text) {
  return Tarvel::StringUtil::Base64Encode(ToBytes(text));
}

std::string Replaced(std::string text, const std::string &what, const std::string &with) {
  for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + with.size())) {
    text.replace(at, what.size(), with);
  }
  return text;
}

/// `text` as character data, in which no CDATA section can end.
std::string Escaped(const std::string &text) {
  return Replaced(Replaced(Replaced(text, "&", "&amp;"), "<", "&lt;"), ">", "&gt;");
}

/// The texts between two marks.
Texts Between(const std::string &text, const std::string &begin, const std::string &end) {
  Texts found;
  for (std::size_t at = text.find(begin); at != std::string::npos; at = text.find(begin, at)) {
    at += begin.size();
    found.push_back(text.substr(at, text.find(end, at) - at));
  }
  return found;
}

/// The values of signatures and legs.
Texts ValuesIn(const std::string &xml) {
  Texts values;
  for (const char *name : {"SignatureValue>", "DigestValue>", "BinaryExchange>"}) {
    for (const std::string &value : Between(xml, name, "<")) {
      if (!value.empty()) {
        values.push_back(value);
      }
    }
  }
  return values;
}

bool HasPassword(const std::string &request) {
  return request.find("canary-") != std::string::npos;
}

/// The texts that must not be seen: parts of the secrets.
Texts Canaries(const std::string &request) {
  Texts canaries = {"NameID", "X509Data"};
  if (HasPassword(request)) {
    const std::string base64 = Base64(CANARY_PASSWORD);
    canaries.insert(canaries.end(), {"canary-", base64.substr(0, 12)});
  }
  for (const std::string &text : {request, ReadDataFile("tokens/signed-by-other.xml")}) {
    for (const std::string &value : ValuesIn(text)) {
      canaries.push_back(value.substr(0, 12));
    }
  }
  return canaries;
}

/// What a service can repeat of an operation, as character data.
std::string Everything(const std::string &request) {
  std::string all;
  if (HasPassword(request)) {
    const std::string password = CANARY_PASSWORD;
    all = Escaped(password) + " " + Escaped(Escaped(password)) + " " + Base64(password);
  }
  for (const std::string &value : ValuesIn(request)) {
    all += " " + value + " " + Escaped(value);
  }
  return all + " " + Escaped(HeldToken().ToXml()) + " " + Escaped(Escaped(HeldToken().ToXml())) + " " +
         Escaped(request);
}

struct Echo {
  const char *name;
  std::function<std::string(const Request &)> answer;
};

void PrintTo(const Echo &echo, std::ostream *out) {
  *out << echo.name;
}

std::string Fault(const std::string &code, const std::string &text, const std::string &detail) {
  return Envelope("<soapenv:Fault><faultcode>" + code + "</faultcode><faultstring>" + text + "</faultstring><detail>" +
                  detail + "</detail></soapenv:Fault>");
}

const Echo ECHOES[] = {
    {"InTheFaultString", [](const Request &request) { return Fault("wst:BadRequest", Everything(request.body), ""); }},
    {"InTheTextOfARefusal",
     [](const Request &request) { return Fault("wst:FailedAuthentication", Everything(request.body), ""); }},
    {"InTheDetail",
     [](const Request &request) { return Fault("wst:BadRequest", "", "<a>" + Everything(request.body) + "</a>"); }},
    {"InTheCode", [](const Request &request) { return Fault("wst:" + Everything(request.body), "", ""); }},
    {"InTheCodeWithoutPrefix", [](const Request &request) { return Fault(Everything(request.body), "", ""); }},
    {"AsElementsOfTheDetail",
     [](const Request &request) {
       return Fault("wst:BadRequest", "", request.body + WithoutXmlDeclaration(HeldToken().ToXml()));
     }},
    {"AfterAThousandBytes",
     [](const Request &request) {
       return Fault("wst:BadRequest", std::string(1000, '.') + Everything(request.body), "");
     }},
    {"CutInTheMiddle",
     [](const Request &request) {
       const std::string secret = HasPassword(request.body) ? CANARY_PASSWORD : ValuesIn(request.body).front();
       return Fault("wst:BadRequest", Escaped(secret.substr(0, 12)), Base64(secret).substr(0, 14));
     }},
    {"InAnException",
     [](const Request &request) -> std::string {
       throw CommunicationException("Server returned error: 400 " + Everything(request.body));
     }},
    {"InARefusedToken", [](const Request &) { return IssueResponse(ReadDataFile("tokens/signed-by-other.xml")); }},
    {"InTextThatIsNotXml", [](const Request &request) { return request.body + Everything(request.body); }},
    {"InAnElementWithoutToken",
     [](const Request &request) { return Envelope("<a>" + Everything(request.body) + "</a>"); }},
};

class EchoingService : public testing::TestWithParam<Echo> {};

TEST_P(EchoingService, GetsNoSecretIntoAnEventOrTheLog) {
  for (const ObservedOperation &operation : ObservedOperations()) {
    for (const int level : {0, 8, 63, 64, std::numeric_limits<int>::max()}) {
      const ScopedLogLevel scope(level);
      const RecordedLog log;
      const auto observer = std::make_shared<RecordedEvents>();
      ServiceOptions options;
      options.observer = observer;
      options.refusedTokenSink = [](const std::string &xml) { throw CommunicationException(xml); };
      std::string request;
      const auto service = ObservedService(
          [&](const Request &sent) {
            request = sent.body;
            return GetParam().answer(sent);
          },
          options);
      EXPECT_THROW(operation.run(*service), Tarvel::Exception) << operation.name;
      ASSERT_GT(request.size(), 1000u);
      Texts seen = observer->Lines();
      ASSERT_GE(seen.size(), 4u);
      const Texts lines = log.Lines();
      seen.insert(seen.end(), lines.begin(), lines.end());
      for (const std::string &canary : Canaries(request)) {
        for (const std::string &line : seen) {
          EXPECT_EQ(line.find(canary), std::string::npos)
              << operation.name << " at level " << level << " shows\n  " << canary << "\nin\n  " << line;
        }
      }
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Service, EchoingService, testing::ValuesIn(ECHOES),
                         [](const auto &echo) { return std::string(echo.param.name); });

// Shows that the test above is able to fail: the exception contains what the service repeats.
TEST(EchoedPassword, StaysInTheExceptionOnly) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const auto service = ObservedService(
      [](const Request &) {
        return FaultResponse("wst:FailedAuthentication", "no '" + Escaped(CANARY_PASSWORD) + "'");
      },
      options);
  try {
    service->AcquireToken("alice", CANARY_PASSWORD, SpecFor(60));
    FAIL();
  } catch (const InvalidCredentialsException &failure) {
    EXPECT_EQ(failure.what(), "Authentication failed: no '" + std::string(CANARY_PASSWORD) + "'");
  }
  const Texts lines = observer->Lines();
  ASSERT_EQ(lines.size(), 5u);
  EXPECT_EQ(lines[3], "fault {http://docs.oasis-open.org/ws-sx/ws-trust/200512}FailedAuthentication "
                      "wst:FailedAuthentication: no '***' ()");
  EXPECT_EQ(lines[4], "ended InvalidCredentialsException: Authentication failed: no '***'");
}

TEST(EchoedPassword, OfOneCharacterIsMaskedEverywhere) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const auto service = ObservedService([](const Request &) { return FaultResponse("wst:x", "axb"); }, options);
  EXPECT_THROW(service->AcquireToken("alice", "x", SpecFor(60)), SsoException);
  EXPECT_EQ(observer->LastFault().text, "a***b");
  EXPECT_EQ(observer->LastFault().codeName, "***");
}

// The text of a token can have any form, because the caller may implement `SamlToken` itself.
TEST(EchoedToken, IsMaskedInTheFormThatTheOperationReceived) {
  const TokenStandIn token("_1", "token text", SamlToken::HOLDER_OF_KEY);
  const std::function<void(const SecurityTokenService &)> operations[] = {
      [&](const SecurityTokenService &service) { service.AcquireTokenByToken(token, SpecFor(60)); },
      [&](const SecurityTokenService &service) { service.ValidateSubject(token); },
      [&](const SecurityTokenService &service) { service.RenewToken(token, 60); }};
  for (const auto &run : operations) {
    const auto observer = std::make_shared<RecordedEvents>();
    ServiceOptions options;
    options.observer = observer;
    const SecurityTokenServiceImpl service(
        std::make_shared<const RequestBuilderStandIn>(),
        std::make_shared<TransportStandIn>([](const Request &) { return "fault:not [token text]"; }),
        std::make_shared<const ResponseHandlerStandIn>(), TrustedCertificates(), options);
    EXPECT_THROW(run(service), InvalidCredentialsException);
    EXPECT_EQ(observer->Lines().back(), "ended InvalidCredentialsException: not [***]");
  }
}

// Verification may quote a value of the refused token.
TEST(RefusedToken, IsMaskedInTheMessageOfItsRefusal) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const std::string token = ReadDataFile("tokens/bearer.xml");
  const std::string digest = Between(token, "DigestValue>", "<").front();
  const std::string wrong = Replaced(token, "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", digest);
  const SecurityTokenServiceImpl service(
      std::make_shared<const RequestBuilderStandIn>(),
      std::make_shared<TransportStandIn>([&](const Request &) { return "issued:" + wrong; }),
      std::make_shared<const ResponseHandlerStandIn>(), TrustedCertificates(), options);
  EXPECT_THROW(service.AcquireTokenByCertificate(SpecFor(60)), SsoException);
  EXPECT_EQ(observer->Lines().back(), "ended InvalidSignatureException: Signature verification error. The signature "
                                      "algorithm \"***\" is not accepted");
}

// A code is divided at its colon, and an exception quotes only the prefix.
TEST(EchoedPassword, WithAColonIsMaskedInTheCode) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const auto service = ObservedService([](const Request &) { return FaultResponse("pass:word", ""); }, options);
  EXPECT_THROWS_MESSAGE(service->AcquireToken("alice", "pass:word", SpecFor(60)), ParseException,
                        "Element faultcodeat 2,279 uses undefined prefix: `pass'");
  const Texts lines = observer->Lines();
  ASSERT_EQ(lines.size(), 5u);
  EXPECT_EQ(lines[3], "fault {}*** ***:  ()");
  EXPECT_EQ(lines[4], "ended ParseException: Element faultcodeat 2,279 uses undefined prefix: `***'");
}

TEST(EchoedPassword, ThatIsEmptyMasksNothing) {
  const auto observer = std::make_shared<RecordedEvents>();
  ServiceOptions options;
  options.observer = observer;
  const auto service = ObservedService([](const Request &) { return FaultResponse("wst:x", "axb"); }, options);
  EXPECT_THROW(service->AcquireToken("alice", "", SpecFor(60)), SsoException);
  EXPECT_EQ(observer->LastFault().text, "axb");
}

} // namespace
} // namespace SsoClient
