# SPDX-License-Identifier: Apache-2.0
"""The rows of the table. A row may use a token that an earlier row has written."""

import deployment
import relay
from row import SERVICE_FAULT, TOKEN_INVALID, Row

BY_PASSWORD = ["acquire", "--user", deployment.USER, "--password-file", "password"]
WRONG_PASSWORD = ["acquire", "--user", deployment.USER, "--password-file", "wrong-password"]
IDENTITY = ["--cert", "client.pem", "--key", "client.key"]
NAME_QUALIFIER = "http://cxf.apache.org/sts"
SAML11, SAML20 = "urn:oasis:names:tc:SAML:1.1:nameid-format:", "urn:oasis:names:tc:SAML:2.0:nameid-format:"
PERSISTENT, X509_SUBJECT, UNSPECIFIED = SAML20 + "persistent", SAML11 + "X509SubjectName", SAML11 + "unspecified"
KEYS = {PERSISTENT: "persistent", X509_SUBJECT: "x509-subject", UNSPECIFIED: "unspecified"}


def about(name, name_format, groups):
    """The facts of a token's subject."""
    name_id = {"value": name, "format": name_format, "nameQualifier": NAME_QUALIFIER, "spNameQualifier": None,
               "spProvidedId": None}
    principal = {"name": name, "domain": f"nameid:{KEYS[name_format]};name-qualifier={NAME_QUALIFIER}"}
    return {"subject": principal, "nameId": name_id, "groups": groups}


USER = about(deployment.USER, PERSISTENT, deployment.GROUPS)
CERTIFICATE = about(deployment.CERTIFICATE_SUBJECT, X509_SUBJECT, [])
# The service writes another format when a token, and not a credential, names the subject.
OF_USER_TOKEN = about(deployment.USER, UNSPECIFIED, deployment.GROUPS)
OF_CERTIFICATE_TOKEN = about(deployment.CERTIFICATE_SUBJECT, UNSPECIFIED, [])
OTHER_USER = about(deployment.OTHER_USER, UNSPECIFIED, [])

def attribute(name, name_format, friendly_name, *values):
    """An attribute with values that are text."""
    return {"name": name, "nameFormat": name_format, "friendlyName": friendly_name,
            "values": [{"text": value, "xml": False, "nil": False} for value in values]}


GROUPS = attribute("http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity",
                   "urn:oasis:names:tc:SAML:2.0:attrname-format:uri", "groups", "corp\\Kölner €", "users")
ACTED_AS = attribute("ActAs", NAME_QUALIFIER, None, deployment.OTHER_USER)

BEARER = {"confirmation": "bearer"}
HOLDER_OF_KEY = {"confirmation": "holder-of-key"}

# WSS4J's fault for every failed check. A policy reports a missing signature as a general fault.
SECURITY_ERROR = ["SecurityError"]
POLICY_ERROR = ["SecurityError", "Server"]


def refused(**changes):
    """Changes of a request that the service refuses with a security error."""
    return {name.replace("_", " "): (change, SERVICE_FAULT, POLICY_ERROR if "signature" in name else SECURITY_ERROR)
            for name, change in changes.items()}


PASSWORD_CHANGES = refused(password=relay.PASSWORD)
SIGNED_CHANGES = refused(lifetime=relay.LIFETIME, timestamp=relay.TIMESTAMP, missing_signature=relay.SIGNATURE_REMOVED)
TOKEN_CHANGES = {**SIGNED_CHANGES, **refused(presented_token=relay.PRESENTED_TOKEN)}


def changes_by_certificate(folder):
    """Changes of a request that a certificate in the message signs."""
    lines = (folder / "other.pem").read_text(encoding="utf-8").splitlines()
    text = "".join(lines[lines.index("-----BEGIN CERTIFICATE-----") + 1:lines.index("-----END CERTIFICATE-----")])
    return {**SIGNED_CHANGES, **refused(certificate=relay.certificate(text))}


def issue_rows(by_certificate):
    """Issue by password, by certificate and by token."""
    both = {**PASSWORD_CHANGES, **by_certificate}
    rows = [Row("issue by password", "bearer", endpoint, BY_PASSWORD, {**USER, **BEARER}, "bearer.xml", PASSWORD_CHANGES)
            for endpoint in ("/plain/ut", "/ut", "/sts")]
    rows += [Row("issue by password, with an identity", "holder-of-key", endpoint, BY_PASSWORD + IDENTITY + ["--renewable"],
                 {**USER, **HOLDER_OF_KEY}, "key.xml", both) for endpoint in ("/plain/ut-x509", "/ut-x509")]
    # The endpoint also permits a request with only the password. Without its signature, the request is such a request.
    with_password = {name: change for name, change in both.items() if name != "missing signature"}
    rows.append(Row("issue by password, with an identity", "holder-of-key", "/sts", BY_PASSWORD + IDENTITY + ["--renewable"],
                    {**USER, **HOLDER_OF_KEY}, "key.xml", with_password))
    rows += [Row("issue by certificate", "holder-of-key", endpoint, ["acquire", *IDENTITY, "--renewable"],
                 {**CERTIFICATE, **HOLDER_OF_KEY}, "certificate.xml", by_certificate)
             for endpoint in ("/plain/x509", "/x509", "/sts")]
    for file, facts in {"key.xml": OF_USER_TOKEN, "certificate.xml": OF_CERTIFICATE_TOKEN}.items():
        source = "password" if file == "key.xml" else "certificate"
        rows += [Row(f"issue by token (by {source})", "holder-of-key", endpoint, ["acquire", "--token", file, *IDENTITY],
                     {**facts, **HOLDER_OF_KEY}, "exchanged.xml", TOKEN_CHANGES)
                 for endpoint in ("/plain/saml", "/saml", "/sts")]
    rows.append(Row("issue by token (by password)", "bearer", "/saml", ["acquire", "--token", "key.xml", *IDENTITY, "--bearer"],
                    {**OF_USER_TOKEN, **BEARER}, "unused.xml", TOKEN_CHANGES))
    rows.append(Row("issue by bearer token", "holder-of-key", "/saml", ["acquire", "--token", "bearer.xml", *IDENTITY],
                    code=SERVICE_FAULT, fault="SecurityError",
                    reason="no service can check a signature that refers to a token without a key"))
    return rows


def delegation_rows(by_certificate):
    """Issue for another party: `wst:OnBehalfOf`, and `wst14:ActAs`."""
    to_other = ["--delegate-to", deployment.OTHER_USER]
    rows = [Row("issue by password, on behalf of a user", "bearer", endpoint, BY_PASSWORD + to_other + ["--bearer"],
                {**OTHER_USER, **BEARER}, "unused.xml", PASSWORD_CHANGES) for endpoint in ("/plain/ut", "/ut")]
    rows += [Row("issue by password, with an identity, on behalf of a user", "holder-of-key", "/ut",
                 BY_PASSWORD + IDENTITY + to_other, {**OTHER_USER, **HOLDER_OF_KEY}, "unused.xml", PASSWORD_CHANGES),
             Row("issue by password, with an identity, on behalf of a user", "holder-of-key", "/ut-x509",
                 BY_PASSWORD + IDENTITY + to_other, code=SERVICE_FAULT, fault="Server",
                 reason="the client does not sign this request, and the endpoint requires a signature"),
             Row("issue by certificate, on behalf of a user", "holder-of-key", "/x509", ["acquire", *IDENTITY, *to_other],
                 {**OTHER_USER, **HOLDER_OF_KEY}, "unused.xml", by_certificate),
             Row("issue by token, on behalf of a user", "holder-of-key", "/saml",
                 ["acquire", "--token", "key.xml", *IDENTITY, *to_other], {**OTHER_USER, **HOLDER_OF_KEY}, "unused.xml",
                 TOKEN_CHANGES),
             Row("issue by password, on behalf of an unknown user", "bearer", "/ut",
                 BY_PASSWORD + ["--delegate-to", "mallory", "--bearer"], code=SERVICE_FAULT, fault="RequestFailed",
                 reason="the service does not permit it"),
             Row("issue by password, to act as a user", "bearer", "/ut",
                 BY_PASSWORD + to_other + ["--bearer", "--dialect-switch", "delegation=act-as"],
                 {**USER, **BEARER, "attributes": [GROUPS, ACTED_AS]}, "unused.xml", PASSWORD_CHANGES)]
    return rows


def address_rows(by_certificate):
    """`wsp:AppliesTo`, audiences and WS-Addressing."""
    application = "https://app.example/orders"
    audiences = ["--audience", "https://a.example/", "--audience", "https://b.example/"]
    message_id = refused(message_id=relay.MESSAGE_ID)
    return [
        Row("issue by password, for a service (AppliesTo)", "bearer", "/ut", BY_PASSWORD + ["--applies-to", application],
            {**USER, **BEARER, "audience": [application]}, "unused.xml", PASSWORD_CHANGES),
        Row("issue by password, for an unknown service (AppliesTo)", "bearer", "/ut",
            BY_PASSWORD + ["--applies-to", "https://unknown.example/"], code=SERVICE_FAULT, fault="RequestFailed",
            reason="the service does not permit it"),
        Row("issue by password, for two audiences", "bearer", "/ut", BY_PASSWORD + audiences,
            {**USER, **BEARER, "audience": ["(https://a.example/) and (https://b.example/)"]}, "unused.xml", PASSWORD_CHANGES),
        Row("issue by password, with addressing", "bearer", "/addressing", BY_PASSWORD + ["--addressing"], {**USER, **BEARER},
            "unused.xml", PASSWORD_CHANGES),
        Row("issue by certificate, with addressing", "holder-of-key", "/addressing-x509",
            ["acquire", *IDENTITY, "--addressing"], {**CERTIFICATE, **HOLDER_OF_KEY}, "unused.xml",
            {**by_certificate, **message_id}),
        Row("renew, with addressing", "holder-of-key", "/addressing-x509", ["renew", "key.xml", *IDENTITY, "--addressing"],
            {**USER, **HOLDER_OF_KEY}, "unused.xml", {**by_certificate, **message_id}),
    ]


def renew_rows(by_certificate):
    """Renew."""
    rows = []
    for file, facts in {"key.xml": USER, "certificate.xml": CERTIFICATE}.items():
        source = "password" if file == "key.xml" else "certificate"
        rows += [Row(f"renew (by {source})", "holder-of-key", endpoint, ["renew", file, *IDENTITY], {**facts, **HOLDER_OF_KEY},
                     "renewed.xml", by_certificate) for endpoint in ("/plain/x509", "/x509", "/sts")]
    silent = "without `--renewable`, with `renewing=when-true`"  # the service then decides
    rows += [Row(f"issue by certificate, {silent}", "holder-of-key", "/x509",
                 ["acquire", *IDENTITY, "--dialect-switch", "renewing=when-true"], {**CERTIFICATE, **HOLDER_OF_KEY},
                 "silent.xml", by_certificate),
             Row(f"renew, of a token that was asked for {silent}", "holder-of-key", "/x509", ["renew", "silent.xml", *IDENTITY],
                 {**CERTIFICATE, **HOLDER_OF_KEY}, "unused.xml", by_certificate)]
    rows.append(Row("renew, of a token that was asked for without `--renewable`", "holder-of-key", "/x509",
                    ["renew", "exchanged.xml", *IDENTITY], code=SERVICE_FAULT, fault="RequestFailed",
                    reason="the service does not permit it"))
    return rows


def validate_rows():
    """Validate. The service's verdict about a changed token is "invalid"."""
    changes = {"token": (relay.PRESENTED_TOKEN, TOKEN_INVALID, [None])}
    tokens = {"bearer.xml": "bearer", "key.xml": "holder-of-key", "exchanged.xml": "holder-of-key", "renewed.xml": "holder-of-key"}
    names = {"exchanged.xml": "validate, of an exchanged token", "renewed.xml": "validate, of a renewed token"}
    rows = [Row(names.get(file, "validate"), confirmation, endpoint, ["validate", file], {"valid": True}, None, changes)
            for file, confirmation in tokens.items() for endpoint in ("/plain/timestamp", "/sts")]
    rows.append(Row("validate, with addressing", "bearer", "/addressing", ["validate", "bearer.xml", "--addressing"],
                    {"valid": True}, None, changes))
    return rows


def wrong_password_rows():
    """A wrong password is recognised if the service reports it with a fault that the dialect contains."""
    return [
        Row("issue by a wrong password", "bearer", "/ut", WRONG_PASSWORD, code=SERVICE_FAULT, fault="SecurityError",
            reason="the service reports a general security error"),
        Row("issue by a wrong password", "bearer", "/fault-names", WRONG_PASSWORD, code=3, fault="FailedAuthentication",
            reason="the service reports the failed authentication"),
    ]


def switch_rows():
    """Each switch of the dialect: without it, the operation is refused."""
    by_both = BY_PASSWORD + IDENTITY
    exchange = ["acquire", "--token", "key.xml", *IDENTITY]

    def without(switch, operation, confirmation, endpoint, arguments, fault):
        return Row(f"{operation}, with `{switch}`", confirmation, endpoint, arguments + ["--dialect-switch", switch],
                   code=SERVICE_FAULT, fault=fault, reason="the service needs the dialect's value")

    delegated = BY_PASSWORD + ["--delegate-to", deployment.OTHER_USER, "--bearer"]
    return [
        without("delegatable=always", "issue by password", "bearer", "/ut", BY_PASSWORD, "BadRequest"),
        without("use-key=reference", "issue by password, with an identity", "holder-of-key", "/ut-x509", by_both, "BadRequest"),
        without("use-key=never", "issue by password, with an identity", "holder-of-key", "/ut-x509", by_both, "InvalidRequest"),
        without("use-key=reference", "issue by token", "holder-of-key", "/saml", exchange, "InvalidRequest"),
        without("token-type-reference=established", "issue by token", "holder-of-key", "/saml", exchange, "SecurityError"),
        without("delegation=delegate-to", "issue by password, on behalf of a user", "bearer", "/ut", delegated, "BadRequest"),
        without("addressing=false", "issue by password", "bearer", "/addressing", BY_PASSWORD,
                "MessageAddressingHeaderRequired"),
        without("credential-faults=none", "issue by a wrong password", "bearer", "/fault-names", WRONG_PASSWORD,
                "FailedAuthentication"),
    ]


def all_rows(folder):
    """All rows, in the order in which they run."""
    by_certificate = changes_by_certificate(folder)
    return (issue_rows(by_certificate) + delegation_rows(by_certificate) + address_rows(by_certificate) +
            renew_rows(by_certificate) + validate_rows() + wrong_password_rows() + switch_rows())
