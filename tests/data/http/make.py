#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes the tokens and the signed requests of this folder, with xmlsec1 and openssl. The keys are those of ../tokens and
../crypto. Each ECDSA signature differs from run to run. The folder rfc9421 contains test cases of that RFC's appendix B."""

import base64
import os
import re
import subprocess
import tempfile

from message_signature import (content_digest, sign, signature_base, thumbprint, write_request)

HERE = os.path.dirname(os.path.abspath(__file__))
TOKENS = os.path.join(HERE, '..', 'tokens')
CRYPTO = os.path.join(HERE, '..', 'crypto')
ASSERTION = 'urn:oasis:names:tc:SAML:2.0:assertion:Assertion'
CREATED = 1767323045  # 2026-01-02T03:04:05Z
BODY = b'{"amount": 12}'


def read(*path):
    with open(os.path.join(*path), encoding='ascii') as file:
        return file.read()


def certificate(folder, name):
    return ''.join(line for line in read(folder, name + '.crt').splitlines() if '-----' not in line)


def make_token(name):
    """A token like ../tokens/holder-of-key.xml for the holder of another certificate."""
    text = read(TOKENS, 'holder-of-key.xml')
    text = text.replace(certificate(TOKENS, 'holder'), certificate(CRYPTO, name))
    text = re.sub(r'(<ds:(DigestValue|SignatureValue)>)[^<]*', r'\1', text)
    with tempfile.NamedTemporaryFile('w', suffix='.xml') as unsigned:
        unsigned.write(text)
        unsigned.flush()
        subprocess.run(['xmlsec1', '--sign', '--privkey-pem', os.path.join(TOKENS, 'sts-rsa.key'), '--id-attr:ID', ASSERTION,
                        '--output', os.path.join(HERE, 'holder-%s.xml' % name), unsigned.name], check=True)


def token_value(path):
    with open(path, 'rb') as file:
        return 'SAML ' + base64.b64encode(file.read()).decode()


def make_request(name, key, token, algorithm, names, method='POST', uri='https://service.example/pay?to=bob', body=BODY,
                 parameters='', fields=()):
    fields = [('Host', 'service.example'), ('Authorization', token_value(token)), *fields]
    if body is not None:
        fields.append(('Content-Digest', content_digest(body)))
    with tempfile.NamedTemporaryFile() as public:
        subprocess.run(['openssl', 'pkey', '-in', key, '-pubout', '-out', public.name], check=True)
        parameters = parameters.replace('KEYID', thumbprint(public.name))
    value = '(' + ' '.join('"%s"' % part for part in names) + ')' + ';created=%d' % CREATED + parameters
    request = (method, uri, fields, body)
    signature = base64.b64encode(sign(key, algorithm, signature_base(request, names, value))).decode()
    fields.append(('Signature-Input', 'proof=' + value))
    fields.append(('Signature', 'proof=:%s:' % signature))
    write_request(os.path.join(HERE, name + '.http'), request)


def main():
    for name in ('p256', 'p384', 'p521', 'rsa1024'):
        make_token(name)
    usual = ['@method', '@target-uri', 'authorization', 'content-digest']
    rsa = (os.path.join(TOKENS, 'holder.key'), os.path.join(TOKENS, 'holder-of-key.xml'), 'rsa-v1_5-sha256')
    make_request('rsa', *rsa, usual, parameters=';keyid="KEYID";alg="rsa-v1_5-sha256";nonce="n-1"')
    for name, algorithm in (('p256', 'ecdsa-p256-sha256'), ('p384', 'ecdsa-p384-sha384')):
        make_request(name, os.path.join(CRYPTO, name + '.key'), os.path.join(HERE, 'holder-%s.xml' % name), algorithm, usual,
                     parameters=';alg="%s";keyid="KEYID"' % algorithm)
    make_request('key-value', os.path.join(TOKENS, 'holder.key'), os.path.join(HERE, '..', 'saml2', 'holder-rsa-value.xml'),
                 'rsa-v1_5-sha256', usual)
    make_request('get', *rsa, ['authorization', '@target-uri', '@method'], method='GET', body=None)
    make_request('parts-of-target', *rsa, ['@query', '@path', '@authority', '@scheme', 'authorization', '@method'],
                 method='DELETE', uri='https://service.example:8443', body=None, parameters=';expires=%d' % (CREATED + 5))
    make_request('request-target', *rsa, ['@method', '@request-target', '@authority', '@scheme', 'authorization', 'x-part',
                                          'content-digest'],
                 fields=[('X-Part', 'one'), ('Other', 'x'), ('x-part', 'two  three')],
                 parameters=';tag="a \\"tag\\"";keyid="KEYID";unknown;number=-1.5')


if __name__ == '__main__':
    main()
