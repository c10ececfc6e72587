# SPDX-License-Identifier: Apache-2.0
"""What a deployer makes and starts: keys and certificates, users, and the token service in a JVM of its own."""

import pathlib
import subprocess
import threading

# A user, a password and a group that US-ASCII cannot write. The user and the group have a character that ISO-8859-1 cannot
# write, either.
USER = "jürgen€@corp.example"
PASSWORD = "paßwörter"
GROUPS = [{"name": "Kölner €", "domain": "corp"}, {"name": "users", "domain": ""}]
OTHER_USER = "bób"
CERTIFICATE_SUBJECT = "CN=Jürgen €,O=Beispiel"

START_SEC = 120  # how long the service may take to start

# WS-SecurityPolicy's WssX509V3Token10 requires a certificate of version 3, which has extensions.
EXTENSIONS = "basicConstraints=CA:FALSE\n"


def openssl(folder, *arguments):
    """Runs openssl in a folder. Its messages are shown when it fails."""
    done = subprocess.run(["openssl", *arguments], cwd=folder, capture_output=True, text=True, check=False)
    if done.returncode != 0:
        raise RuntimeError(f"openssl {arguments[0]}: {done.stderr}")


def make_certificate(folder, name, subject, extensions=EXTENSIONS):
    """Makes a key, and a certificate that the authority issues for it: NAME.key and NAME.pem."""
    (folder / f"{name}.ext").write_text(extensions, encoding="utf-8")
    openssl(folder, "req", "-newkey", "rsa:2048", "-nodes", "-utf8", "-subj", subject, "-keyout", f"{name}.key", "-out",
            f"{name}.csr")
    openssl(folder, "x509", "-req", "-in", f"{name}.csr", "-CA", "ca.pem", "-CAkey", "ca.key", "-CAcreateserial", "-days", "30",
            "-extfile", f"{name}.ext", "-out", f"{name}.pem")


def prepare(folder):
    """Fills a folder with all keys, certificates, users and passwords of a run."""
    openssl(folder, "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj", "/CN=Interop CA", "-days", "30", "-keyout",
            "ca.key", "-out", "ca.pem")
    make_certificate(folder, "server", "/CN=127.0.0.1", EXTENSIONS + "subjectAltName=IP:127.0.0.1\n")
    make_certificate(folder, "sts", "/CN=sts")
    make_certificate(folder, "client", "/O=Beispiel/CN=Jürgen €")
    make_certificate(folder, "other", "/CN=other")
    for name in ("server", "sts"):
        openssl(folder, "pkcs12", "-export", "-in", f"{name}.pem", "-inkey", f"{name}.key", "-name", name, "-passout",
                "pass:interop", "-out", f"{name}.p12")
    (folder / "trusted.pem").write_bytes((folder / "ca.pem").read_bytes() + (folder / "sts.pem").read_bytes())
    groups = [group["domain"] + "\\" + group["name"] if group["domain"] else group["name"] for group in GROUPS]
    users = ["\t".join([USER, PASSWORD, *groups]), f"{OTHER_USER}\thidden"]
    (folder / "users").write_text("\n".join(users) + "\n", encoding="utf-8")
    (folder / "password").write_text(PASSWORD + "\n", encoding="utf-8")
    (folder / "wrong-password").write_text("wrong\n", encoding="utf-8")


class TokenService:
    """The running service. The JVM ends when its standard input ends, at the latest with this process."""

    def __init__(self, build, folder):
        self._log = open(folder / "service.log", "w", encoding="utf-8")
        libraries = pathlib.Path(build) / "interop"
        self._process = subprocess.Popen(
            ["java", "-cp", f"{libraries}/classes:{libraries}/lib/*", "interop.TokenService", str(folder)],
            stdin=subprocess.PIPE, stdout=subprocess.PIPE, stderr=self._log, text=True)
        watch = threading.Timer(START_SEC, self._process.kill)
        watch.start()
        self.url = self._process.stdout.readline().strip()
        watch.cancel()
        if not self.url:
            self.close()
            raise RuntimeError("the token service does not start:\n" + (folder / "service.log").read_text(encoding="utf-8"))

    def close(self):
        """Ends the service."""
        self._process.stdin.close()
        self._process.stdout.close()
        try:
            self._process.wait(30)
        except subprocess.TimeoutExpired:
            self._process.kill()
            self._process.wait()
        self._log.close()
