# SPDX-License-Identifier: Apache-2.0
"""A TLS relay between the tool and the service, which changes what it passes on."""

import http.client
import http.server
import re
import ssl
import threading


def replaced(pattern, by):
    """A change of a message: the first match of a pattern is replaced."""
    compiled = re.compile(pattern.encode(), re.DOTALL)
    return lambda message: compiled.sub(by.encode(), message, count=1)


def next_digit(pattern):
    """A change of a message: the digit that is the last group of a pattern becomes another one."""
    compiled = re.compile(pattern.encode(), re.DOTALL)
    return lambda message: compiled.sub(lambda match: match[1] + bytes([48 + (match[2][0] - 47) % 10]), message, count=1)


# Changes of requests. Each leaves a message of the right form, so only a password or a signature can reveal the change.
PASSWORD = replaced(r"(<wsse:Password[^>]*>)p", r"\1q")
LIFETIME = next_digit(r"(<soapenv:Body.*?<wst:Lifetime.*?<wsu:Expires>[-0-9T:]*\.\d\d)(\d)")
TIMESTAMP = next_digit(r"(<wsu:Timestamp.*?<wsu:Created>[-0-9T:]*\.\d\d)(\d)")
SIGNATURE_REMOVED = replaced(r"<ds:Signature [^>]*Id=\"holderOfKeyProofSignature\".*?</ds:Signature>", "")
ADDRESSING_REMOVED = replaced(r"<wsa:MessageID.*?</wsa:MessageID>", "")
MESSAGE_ID = replaced(r"(<wsa:MessageID[^>]*>urn:uuid:)........", r"\g<1>00000000")
PRESENTED_TOKEN = replaced(r"(<saml2:NameID[^>]*>)", r"\1x")

# Changes of answers: the subject of the token, and the end of its validity.
SUBJECT = PRESENTED_TOKEN
END = next_digit(r"(<saml2:Conditions [^>]*NotOnOrAfter=\"[-0-9T:]*\.\d\d)(\d)")


def certificate(text):
    """A change of a request: another trusted certificate replaces that of the signature."""
    return replaced(r"(<wsse:BinarySecurityToken[^>]*>)[^<]*", r"\g<1>" + text)


class Relay:
    """Passes requests to a service, with the changes that are set. `is_changed` is whether one of them changed something."""

    def __init__(self, url, folder):
        self.change_request = self.change_answer = None
        self.is_changed = False
        authority, trust = url.removeprefix("https://"), ssl.create_default_context(cafile=folder / "ca.pem")
        relay = self

        class Handler(http.server.BaseHTTPRequestHandler):
            """One request and its answer."""

            def do_POST(self):  # pylint: disable=invalid-name
                """Passes on a request; called by the base class."""
                body = relay._changed(relay.change_request, self.rfile.read(int(self.headers["Content-Length"])))
                headers = {name: self.headers[name] for name in ("Content-Type", "SOAPAction") if name in self.headers}
                service = http.client.HTTPSConnection(authority, context=trust, timeout=60)
                service.request("POST", self.path, body, headers)
                answer = service.getresponse()
                text = relay._changed(relay.change_answer, answer.read())
                service.close()
                self.send_response(answer.status)
                self.send_header("Content-Type", answer.headers["Content-Type"])
                self.send_header("Content-Length", str(len(text)))
                self.end_headers()
                self.wfile.write(text)

            def log_message(self, format, *arguments):  # pylint: disable=redefined-builtin
                """The relay prints nothing; the tool reports what happens."""

        self._server = http.server.HTTPServer(("127.0.0.1", 0), Handler)
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(folder / "server.pem", folder / "server.key")
        self._server.socket = context.wrap_socket(self._server.socket, server_side=True)
        self.url = f"https://127.0.0.1:{self._server.server_address[1]}"
        self._thread = threading.Thread(target=self._server.serve_forever, daemon=True)
        self._thread.start()

    def _changed(self, change, message):
        if change is None:
            return message
        result = change(message)
        self.is_changed = self.is_changed or result != message
        return result

    def close(self):
        """Ends the relay."""
        self._server.shutdown()
        self._server.server_close()
        self._thread.join()
