# SPDX-License-Identifier: Apache-2.0
"""One row of the table: an operation at an endpoint, its expected result, and the changed copies that must be refused."""

import dataclasses

import relay

SIGNATURE_INVALID = 6
TOKEN_INVALID = 5
SERVICE_FAULT = 8
STRICT_HINT = "--profile saml2"


@dataclasses.dataclass
class Outcome:
    """The result of a row. A row that is as expected has no failures."""

    row: "Row"
    failures: list
    changed: list
    calls: int


@dataclasses.dataclass
class Row:
    """`request_changes` are the changes of the request that must be refused, by name, each with the expected exit code and
    faults. `code` is the expected exit code of the row. If the row is refused, `fault` is the fault, and `reason` the reason."""

    operation: str
    confirmation: str
    endpoint: str
    arguments: list
    facts: dict = dataclasses.field(default_factory=dict)
    token: str = None  # the file for the token, if the operation returns one
    request_changes: dict = dataclasses.field(default_factory=dict)
    code: int = 0
    fault: str = None
    reason: str = None

    def run(self, tool):
        """Runs the row and all its changed copies."""
        outcome = Outcome(self, [], [], tool.calls)
        arguments = self.arguments + (["--out", self.token, "--force"] if self.token else [])
        answer = tool.call(self.endpoint, arguments)
        self._expect(outcome, "the operation", answer, self.code, [self.fault])
        if answer.code == self.code == 0:
            self._expect_facts(outcome, answer.facts)
            self._run_changed_requests(outcome, tool)
            if self.token:
                self._run_changed_answers(outcome, tool)
                self._verify(outcome, tool)
                self._run_in_strict_profile(outcome, tool)
        outcome.calls = tool.calls - outcome.calls
        return outcome

    def _run_changed_requests(self, outcome, tool):
        for name, (change, code, faults) in self.request_changes.items():
            answer = tool.call_changed(self.endpoint, self._without_output(), change_request=change)
            self._expect(outcome, f"the request with a changed {name}", answer, code, faults)
            outcome.changed.append(name)

    def _run_changed_answers(self, outcome, tool):
        for name, change in {"token's subject": relay.SUBJECT, "token's end": relay.END}.items():
            answer = tool.call_changed(self.endpoint, self._without_output(), change_answer=change)
            self._expect(outcome, f"the answer with a changed {name}", answer, SIGNATURE_INVALID, [None])
            outcome.changed.append(name)

    def _verify(self, outcome, tool):
        verified = tool.offline("verify", "--profile", "saml2", self.token)
        self._expect(outcome, "verification", verified, 0, [None])
        self._expect_facts(outcome, verified.facts or {})
        changed = tool.change_file(self.token, relay.SUBJECT)
        answer = tool.offline("verify", "--profile", "saml2", changed) if changed else None
        self._expect(outcome, "verification of the token with a changed subject", answer, SIGNATURE_INVALID, [None])

    def _run_in_strict_profile(self, outcome, tool):
        is_token_given = self.arguments[0] != "acquire" or "--token" in self.arguments
        code = TOKEN_INVALID if is_token_given else SERVICE_FAULT
        strict = tool.call(self.endpoint, self._without_output(), profile="strict")
        self._expect(outcome, "the operation in the strict profile", strict, code, [None])
        if STRICT_HINT not in strict.diagnosis:
            self._fail(outcome, f"the refusal by the strict profile has no hint '{STRICT_HINT}': {strict.diagnosis}")

    def _without_output(self):
        return self.arguments + ["--out", "unused.xml", "--force"] if self.token else self.arguments

    def _expect(self, outcome, what, answer, code, faults):
        if answer is None:
            self._fail(outcome, f"{what}: there was nothing to change")
        elif answer.code != code or answer.fault not in faults:
            expected = " or ".join(str(fault) for fault in faults)
            self._fail(outcome, f"{what}: expected exit code {code}, fault {expected}, but: {answer}")

    def _expect_facts(self, outcome, facts):
        for key, expected in self.facts.items():
            if facts.get(key) != expected:
                self._fail(outcome, f"expected the {key} {expected!r}, but: {facts.get(key)!r}")

    def _fail(self, outcome, text):
        outcome.failures.append(f"interop: {self.operation}, {self.confirmation}, {self.endpoint}: {text}")
