# SPDX-License-Identifier: Apache-2.0
"""HTTP message signatures (RFC 9421) with the standard library and the program openssl, for make.py and verify.py."""

import base64
import hashlib
import subprocess
import tempfile
from urllib.parse import urlsplit

HASHES = {'rsa-v1_5-sha256': 'sha256', 'ecdsa-p256-sha256': 'sha256', 'ecdsa-p384-sha384': 'sha384'}
NUMBER_OCTETS = {'ecdsa-p256-sha256': 32, 'ecdsa-p384-sha384': 48}


def component(request, name):
    """The value of a component of (method, uri, fields, body)."""
    method, uri, fields, _ = request
    parts = urlsplit(uri)
    path = parts.path or '/'
    query = '?' + parts.query if '?' in uri else ''
    derived = {
        '@method': method,
        '@target-uri': uri,
        '@scheme': parts.scheme,
        '@authority': parts.netloc.lower(),
        '@request-target': path + query,
        '@path': path,
        '@query': query or '?',
    }
    if name.startswith('@'):
        return derived[name]
    values = [value.strip() for field, value in fields if field.lower() == name]
    assert values, name
    return ', '.join(values)


def signature_base(request, names, parameters):
    lines = ['"%s": %s' % (name, component(request, name)) for name in names]
    lines.append('"@signature-params": ' + parameters)
    return '\n'.join(lines).encode('ascii')


def content_digest(body, algorithm='sha-256'):
    digest = hashlib.new(algorithm.replace('-', ''), body).digest()
    return '%s=:%s:' % (algorithm, base64.b64encode(digest).decode())


def integer(octets):
    octets = octets.lstrip(b'\0')
    octets = (b'\0' if octets[0] & 0x80 else b'') + octets
    return b'\2' + bytes([len(octets)]) + octets


def to_der(value, width):
    content = integer(value[:width]) + integer(value[width:])
    return b'\x30' + bytes([len(content)]) + content


def from_der(der, width):
    assert der[0] == 0x30 and der[1] < 0x80 and der[2] == 2
    first = der[4:4 + der[3]]
    rest = der[4 + der[3]:]
    assert rest[0] == 2
    return b''.join(number.lstrip(b'\0').rjust(width, b'\0') for number in (first, rest[2:2 + rest[1]]))


def sign(key, algorithm, base):
    value = subprocess.run(['openssl', 'dgst', '-' + HASHES[algorithm], '-sign', key], input=base,
                           capture_output=True, check=True).stdout
    return from_der(value, NUMBER_OCTETS[algorithm]) if algorithm in NUMBER_OCTETS else value


def verify(public_key, algorithm, base, value):
    if algorithm in NUMBER_OCTETS:
        value = to_der(value, NUMBER_OCTETS[algorithm])
    with tempfile.NamedTemporaryFile() as signature:
        signature.write(value)
        signature.flush()
        return subprocess.run(['openssl', 'dgst', '-' + HASHES[algorithm], '-verify', public_key, '-signature',
                               signature.name], input=base, capture_output=True, check=False).returncode == 0


def thumbprint(public_key):
    der = subprocess.run(['openssl', 'pkey', '-pubin', '-in', public_key, '-outform', 'DER'], capture_output=True,
                         check=True).stdout
    return hashlib.sha256(der).hexdigest()


def write_request(path, request):
    method, uri, fields, body = request
    with open(path, 'wb') as file:
        lines = [method + ' ' + uri] + [name + ': ' + value for name, value in fields]
        file.write(('\n'.join(lines) + '\n\n').encode('latin-1') + (body or b''))


def read_request(path):
    with open(path, 'rb') as file:
        head, body = file.read().split(b'\n\n', 1)
    first, *lines = head.decode('latin-1').split('\n')
    method, uri = first.split(' ')
    return method, uri, [tuple(line.split(': ', 1)) for line in lines], body
