# SPDX-License-Identifier: Apache-2.0
"""The outcome of a run, as a Markdown table."""

ENDPOINTS = {
    "/plain/ut": "interceptor: UsernameToken",
    "/plain/x509": "interceptor: Signature",
    "/plain/ut-x509": "interceptor: UsernameToken, Signature",
    "/plain/saml": "interceptor: Signature by SAML token",
    "/plain/timestamp": "interceptor: Timestamp",
    "/ut": "policy: UsernameToken",
    "/x509": "policy: endorsing X509Token",
    "/ut-x509": "policy: UsernameToken, endorsing X509Token",
    "/saml": "policy: endorsing SamlToken",
    "/addressing": "policy: UsernameToken, UsingAddressing",
    "/addressing-x509": "policy: endorsing X509Token, UsingAddressing",
    "/fault-names": "policy: UsernameToken; reports fault names",
    "/sts": "policy: any of these",
}


def written(outcomes):
    """Returns the table. A row that is refused shows the reason."""
    lines = ["| Operation | Confirmation | Endpoint | Result | Refused when changed |", "|---|---|---|---|---|"]
    for outcome in outcomes:
        row = outcome.row
        result = "works" if row.code == 0 else f"refused, exit {row.code} (`{row.fault}`): {row.reason}"
        changed = ", ".join(outcome.changed) or "-"
        lines.append(f"| {row.operation} | {row.confirmation} | {ENDPOINTS[row.endpoint]} | {result} | {changed} |")
    lines.append(f"| `examples/other_service`: issue by password, renew, validate, issue by token | holder-of-key | "
                 f"{ENDPOINTS['/sts']} | works | - |")
    return "\n".join(lines) + "\n"
