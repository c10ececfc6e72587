// SPDX-License-Identifier: Apache-2.0

#include "support/report_texts.h"

#include <cstddef>
#include <sstream>

namespace Testing {

using namespace SsoClient;

namespace {

class TextCollector {
public:
  void Add(const std::string &place, const std::string &text) { m_texts.push_back({place, text}); }

  void AddCheck(const TokenReport::CheckResult &result) {
    const std::string check = GetCheckName(result.check);
    Add(check + ", summary", result.summary);
    for (std::size_t i = 0; i < result.findings.size(); ++i) {
      const TokenReport::Finding &finding = result.findings[i];
      const std::string place = check + ", finding " + std::to_string(i) + ", ";
      Add(place + "message", finding.message);
      Add(place + "element", finding.element);
      Add(place + "attribute", finding.attribute);
      Add(place + "path", finding.path);
      Add(place + "wanted", finding.wanted);
      Add(place + "found", finding.found);
      Add(place + "remedy", finding.remedy);
    }
  }

  void AddReference(const TokenReport::Reference &reference) {
    Add("reference, URI", reference.uri);
    Add("reference, target", reference.target);
    for (const std::string &transform : reference.transforms) {
      Add("reference, transform", transform);
    }
    Add("reference, digest method", reference.digestMethod);
    Add("reference, digest wanted", reference.digestWanted);
    Add("reference, digest computed", reference.digestComputed);
  }

  std::vector<ReportText> Take() { return std::move(m_texts); }

private:
  std::vector<ReportText> m_texts;
};

void DescribeDate(std::ostream &out, const char *name, const boost::optional<Tarvel::System::DateTime> &date) {
  out << name << ' ' << (date ? std::to_string(date->GetUtcTime()) : "unknown") << '\n';
}

void DescribeText(std::ostream &out, const char *name, const boost::optional<std::string> &text) {
  out << name << ' ' << (text ? '{' + *text + '}' : "unknown") << '\n';
}

void DescribeFlag(std::ostream &out, const char *name, const boost::optional<bool> &flag) {
  out << name << ' ' << (flag ? *flag ? "yes" : "no" : "unknown") << '\n';
}

void DescribePrincipal(std::ostream &out, const char *name, const PrincipalId &principal) {
  out << name << " {" << principal.name << "} {" << principal.domain << "}\n";
}

void DescribeSubject(std::ostream &out, const UnverifiedClaims &claims) {
  DescribeText(out, "name", claims.nameId);
  DescribeText(out, "format", claims.nameIdFormat);
  if (claims.subject) {
    DescribePrincipal(out, "subject", *claims.subject);
  }
  out << "confirmation " << (claims.confirmation ? static_cast<int>(*claims.confirmation) : -1) << '\n';
  DescribeText(out, "method", claims.confirmationMethod);
  if (claims.fullName) {
    out << "full name {" << claims.fullName->first << "} {" << claims.fullName->second << "}\n";
  }
  out << "certificate {" << claims.certificateSubject << "} " << claims.certificateThumbprint << '\n';
}

void DescribeLists(std::ostream &out, const UnverifiedClaims &claims) {
  for (const PrincipalId &group : claims.groups) {
    DescribePrincipal(out, "group", group);
  }
  for (const Delegate &delegate : claims.delegationChain) {
    DescribePrincipal(out, "delegate", delegate.subject);
    out << "at " << delegate.delegationInstant.GetUtcTime() << '\n';
  }
  for (const std::string &audience : claims.audience) {
    out << "audience {" << audience << "}\n";
  }
  for (const Advice &advice : claims.advice) {
    out << "advice {" << advice.source << "}\n";
    for (const AdviceAttribute &attribute : advice.attributes) {
      out << "attribute {" << attribute.name << "}";
      for (const std::string &value : attribute.values) {
        out << " {" << value << "}";
      }
      out << '\n';
    }
  }
}

void DescribeNameId(std::ostream &out, const char *name, const NameId &nameId) {
  out << name << " {" << nameId.value << "}\n";
  DescribeText(out, "format", nameId.format);
  DescribeText(out, "qualifier", nameId.nameQualifier);
  DescribeText(out, "service's qualifier", nameId.spNameQualifier);
  DescribeText(out, "service's name", nameId.spProvidedId);
}

void DescribeConfirmation(std::ostream &out, const ConfirmationDetails &confirmation) {
  out << "confirmation {" << confirmation.method << "} " << confirmation.publicKey.size() << '\n';
  if (confirmation.nameId) {
    DescribeNameId(out, "confirming", *confirmation.nameId);
  }
  DescribeDate(out, "from", confirmation.notBefore);
  DescribeDate(out, "to", confirmation.notOnOrAfter);
  DescribeText(out, "recipient", confirmation.recipient);
  DescribeText(out, "request", confirmation.inResponseTo);
  DescribeText(out, "address", confirmation.address);
  out << "key " << (confirmation.certificate ? confirmation.certificate->GetSha256Thumbprint() : "none") << '\n';
}

void DescribeConditions(std::ostream &out, const TokenDetails &details) {
  for (const std::set<std::string> &audiences : details.audienceRestrictions) {
    out << "restriction";
    for (const std::string &audience : audiences) {
      out << " {" << audience << "}";
    }
    out << '\n';
  }
  out << "used once " << details.isOneTimeUse << '\n';
  if (details.proxyRestriction) {
    out << "proxies " << details.proxyRestriction->count.value_or(~std::uint64_t(0));
    for (const std::string &audience : details.proxyRestriction->audiences) {
      out << " {" << audience << "}";
    }
    out << '\n';
  }
}

void DescribeStatements(std::ostream &out, const TokenDetails &details) {
  for (const AuthnStatementDetails &statement : details.authnStatements) {
    out << "authenticated " << statement.authnInstant.GetUtcTime() << '\n';
    DescribeText(out, "session", statement.sessionIndex);
    DescribeDate(out, "session end", statement.sessionNotOnOrAfter);
    DescribeText(out, "at", statement.localityAddress);
    DescribeText(out, "host", statement.localityDnsName);
    DescribeText(out, "class", statement.contextClass);
    DescribeText(out, "declaration", statement.contextDeclaration);
    for (const std::string &authority : statement.authenticatingAuthorities) {
      out << "authority {" << authority << "}\n";
    }
  }
  for (const SamlAttribute &attribute : details.attributes) {
    out << "attribute {" << attribute.name << "}\n";
    DescribeText(out, "format", attribute.nameFormat);
    DescribeText(out, "friendly name", attribute.friendlyName);
    for (const AttributeValue &value : attribute.values) {
      out << "value " << value.isXml << value.isNil << " {" << value.text << "}\n";
    }
  }
}

void DescribeSignature(std::ostream &out, const TokenReport &report) {
  for (const TokenReport::Reference &reference : report.references) {
    out << "reference " << reference.resolves << reference.coversToken << reference.digestMatches << '\n';
  }
  for (const TokenReport::TrustedKey &key : report.trustedKeys) {
    out << "key " << key.isNamed << key.isUsable << key.madeSignature << ' ' << key.certificate.get() << '\n';
  }
  for (const TokenReport::NamedCertificate &certificate : report.namedCertificates) {
    out << "named " << certificate.isTrusted << '\n';
  }
}

} // namespace

std::vector<ReportText> PrintableTextsOf(const TokenReport &report) {
  TextCollector texts;
  for (const TokenReport::CheckResult &result : report.checks) {
    texts.AddCheck(result);
  }
  texts.Add("signature algorithm", report.signatureAlgorithm);
  texts.Add("canonicalization", report.canonicalization);
  for (const TokenReport::Reference &reference : report.references) {
    texts.AddReference(reference);
  }
  for (const TokenReport::TrustedKey &key : report.trustedKeys) {
    texts.Add("trusted key, subject", key.subject);
    texts.Add("trusted key, thumbprint", key.thumbprint);
  }
  for (const TokenReport::NamedCertificate &certificate : report.namedCertificates) {
    texts.Add("named certificate, subject", certificate.subject);
    texts.Add("named certificate, thumbprint", certificate.thumbprint);
  }
  return texts.Take();
}

std::string DescribeReport(const TokenReport &report) {
  std::ostringstream out;
  out << "accepted " << report.accepted << "\nrefusal {" << report.refusal << "}\n";
  for (const TokenReport::CheckResult &result : report.checks) {
    out << static_cast<int>(result.check) << ' ' << static_cast<int>(result.outcome) << ' ' << result.unlistedFindings
        << '\n';
    for (const TokenReport::Finding &finding : result.findings) {
      out << finding.line << ' ' << finding.column << ' ' << finding.missedBySec << '\n';
    }
  }
  for (const ReportText &text : PrintableTextsOf(report)) {
    out << text.place << " {" << text.text << "}\n";
  }
  DescribeSignature(out, report);
  out << DescribeClaims(report.claims);
  return out.str();
}

std::string DescribeClaims(const UnverifiedClaims &claims) {
  std::ostringstream out;
  out << "assertion " << claims.isAssertion << '\n';
  DescribeText(out, "id", claims.id);
  DescribeText(out, "issuer", claims.issuer);
  DescribeDate(out, "issued", claims.issueInstant);
  DescribeDate(out, "start", claims.startDate);
  DescribeDate(out, "end", claims.endDate);
  DescribeFlag(out, "renewable", claims.renewable);
  DescribeFlag(out, "delegable", claims.delegable);
  DescribeFlag(out, "solution", claims.solution);
  DescribeSubject(out, claims);
  DescribeLists(out, claims);
  out << (claims.details ? DescribeDetails(*claims.details) : "no details\n");
  return out.str();
}

std::string DescribeDetails(const TokenDetails &details) {
  std::ostringstream out;
  DescribeNameId(out, "issuer", details.issuer);
  out << "issued " << details.issueInstant.GetUtcTime() << '\n';
  DescribeNameId(out, "subject", details.subject);
  for (const ConfirmationDetails &confirmation : details.confirmations) {
    DescribeConfirmation(out, confirmation);
  }
  out << "used confirmation " << details.usedConfirmation << '\n';
  DescribeConditions(out, details);
  DescribeStatements(out, details);
  return out.str();
}

} // namespace Testing
