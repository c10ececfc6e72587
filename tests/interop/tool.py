# SPDX-License-Identifier: Apache-2.0
"""Calls of the tool under test."""

import json
import subprocess


class Answer:
    """What the tool did: its exit code, its JSON, and the name of the fault that it received."""

    def __init__(self, done):
        self.code = done.returncode
        self.facts = json.loads(done.stdout) if done.stdout else None
        self.diagnosis = done.stderr
        faults = [line.split("}")[1].split(" ")[0] for line in done.stderr.splitlines() if line.startswith("ssoclient: fault: {")]
        self.fault = faults[-1] if faults else None

    def __str__(self):
        return f"exit code {self.code}, fault {self.fault}\n{self.diagnosis}"


class Tool:
    """Calls the tool, directly or through the relay. Files are named relative to the folder of the run."""

    def __init__(self, program, folder, url, between, dialect):
        self._program = program.resolve()
        self._folder = folder
        self._url = url
        self._relay = between
        self._dialect = dialect
        self.calls = 0

    def offline(self, *arguments):
        """Runs a command that calls no service."""
        self.calls += 1
        return Answer(subprocess.run([self._program, *arguments, "--trust", "sts.pem", "--format", "json", "-v"], cwd=self._folder,
                                     capture_output=True, text=True, check=False, timeout=120))

    def call(self, endpoint, arguments, profile="saml2", url=None):
        """Runs a command that calls the service at an endpoint."""
        return self.offline(*arguments, "--sts", (url or self._url) + endpoint, "--ca", "ca.pem", "--dialect", self._dialect,
                            "--profile", profile)

    def call_changed(self, endpoint, arguments, change_request=None, change_answer=None):
        """Runs such a command through the relay. Returns None if the relay found nothing to change."""
        self._relay.change_request, self._relay.change_answer = change_request, change_answer
        self._relay.is_changed = False
        answer = self.call(endpoint, arguments, url=self._relay.url)
        return answer if self._relay.is_changed else None

    def change_file(self, name, change):
        """Writes a changed copy of a token, and returns its name; None if there is nothing to change."""
        text = (self._folder / name).read_bytes()
        changed = change(text)
        (self._folder / "changed.xml").write_bytes(changed)
        return "changed.xml" if changed != text else None
