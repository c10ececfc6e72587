#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Verifies a request that SignHttpRequest has signed, without our code.

usage: verify.py REQUEST PUBLIC-KEY TOKEN     the request in the form of message_signature.py, the key in PEM, the token's XML
"""

import base64
import re
import sys

from message_signature import content_digest, read_request, signature_base, thumbprint, verify


def check(path, public_key, token):
    request = read_request(path)
    _, _, fields, body = request
    single = {name.lower(): value for name, value in fields}
    assert len(single) == len(fields), 'a field is there twice'
    with open(token, 'rb') as file:
        assert single['authorization'] == 'SAML ' + base64.b64encode(file.read()).decode(), 'another token'
    label, parameters = single['signature-input'].split('=', 1)
    names = re.match(r'\(((?:"[^"]*" ?)*)\)', parameters).group(1).replace('"', '').split(' ')
    assert {'@method', '@target-uri', 'authorization'} <= set(names), 'not covered'
    if body or 'content-digest' in single:
        assert 'content-digest' in names, 'content not covered'
        assert single['content-digest'] == content_digest(body), 'another digest'
    values = dict(re.findall(r';([a-z]+)=("[^"]*"|[0-9]+)', parameters))
    assert values['keyid'] == '"%s"' % thumbprint(public_key), 'another keyid'
    signature = re.fullmatch(re.escape(label) + '=:(.*):', single['signature']).group(1)
    base = signature_base(request, names, parameters)
    assert verify(public_key, values['alg'].strip('"'), base, base64.b64decode(signature, validate=True)), 'wrong signature'
    print('created=%s' % values['created'], ' '.join(names))


if __name__ == '__main__':
    if len(sys.argv) != 4:
        sys.exit(__doc__)
    check(*sys.argv[1:])
