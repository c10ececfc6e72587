#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes the messages of this folder from the token fixtures: genuine messages, which xmlsec1 signs with the token's
key, and what attackers and careless senders make of them.

The outcome of each is in expected.tsv, with one line for each file: name, options of the verifier, class of the
exception or "accepted", and its text or the proof. The clock of the tests is at 2026-01-02T03:04:05.006Z.

usage: make.py
"""
import os
import re
import subprocess
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
DATA = os.path.join(HERE, '..', '..')
S11 = 'http://schemas.xmlsoap.org/soap/envelope/'
S12 = 'http://www.w3.org/2003/05/soap-envelope'
OASIS = 'http://docs.oasis-open.org/wss/'
WSSE = OASIS + '2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd'
WSU = OASIS + '2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd'
WSSE11 = OASIS + 'oasis-wss-wssecurity-secext-1.1.xsd'
SAML_PROFILE = OASIS + 'oasis-wss-saml-token-profile-1.1'
SAML_ID = SAML_PROFILE + '#SAMLID'
X509 = OASIS + '2004/01/oasis-200401-wss-x509-token-profile-1.0'
DS = 'http://www.w3.org/2000/09/xmldsig#'
MORE = 'http://www.w3.org/2001/04/xmldsig-more#'
EXCLUSIVE = 'http://www.w3.org/2001/10/xml-exc-c14n#'
ENVELOPED = DS + 'enveloped-signature'
NEXT = 'http://schemas.xmlsoap.org/soap/actor/next'
BODY = '<m:Pay xmlns:m="urn:m"><m:To>alice</m:To><m:Amount>10</m:Amount></m:Pay>'
FORGED = BODY.replace('alice', 'mallory')
ROWS = []


def read(name):
    with open(os.path.join(DATA, name), encoding='utf-8') as file:
        return re.sub(r'^<\?xml[^>]*\?>\s*', '', file.read()).strip()


def id_of(token):
    return re.search(r' ID="([^"]+)"', token).group(1)


def run_xmlsec(text, key, signature_id, ids):
    with tempfile.TemporaryDirectory() as folder:
        source = os.path.join(folder, 'in.xml')
        with open(source, 'w', encoding='utf-8', newline='') as file:
            file.write(text)
        command = ['xmlsec1', '--sign', '--privkey-pem', os.path.join(DATA, key + '.key'), '--node-xpath',
                   f"//*[local-name()='Signature' and @Id='{signature_id}']"]
        for attribute, name in ids:
            command += ['--id-attr:' + attribute, name]
        signed = subprocess.run(command + [source], check=True, capture_output=True).stdout.decode()
    return re.sub(r'^<\?xml[^>]*\?>\s*', '', signed).strip()


IDS = [('Id', S11 + ':Body'), ('Id', S12 + ':Body'), ('Id', WSU + ':Timestamp'), ('Id', 'urn:a:To'),
       ('Id', S11 + ':Envelope'), ('Id', S11 + ':Header'), ('Id', 'urn:m:Pay'), ('Id', WSSE + ':Security')]


def sign(text, key='tokens/holder', signature_id='proof', ids=()):
    return run_xmlsec(text, key, signature_id, IDS + list(ids))


def reference(uri, transforms=(EXCLUSIVE,), digest='http://www.w3.org/2001/04/xmlenc#sha256'):
    listed = ''.join(f'<ds:Transform Algorithm="{one}"/>' for one in transforms)
    return (f'<ds:Reference URI="{uri}"><ds:Transforms>{listed}</ds:Transforms><ds:DigestMethod Algorithm="{digest}"/>'
            '<ds:DigestValue/></ds:Reference>')


def token_reference(identifier, token_type=SAML_PROFILE + '#SAMLV2.0', value_type=SAML_ID):
    attribute = f' wsse11:TokenType="{token_type}"' if token_type else ''
    return (f'<wsse:SecurityTokenReference xmlns:wsse11="{WSSE11}"{attribute}>'
            f'<wsse:KeyIdentifier ValueType="{value_type}">{identifier}</wsse:KeyIdentifier>'
            '</wsse:SecurityTokenReference>')


def direct_reference(uri, attributes='', token_type=''):
    attribute = f' xmlns:wsse11="{WSSE11}" wsse11:TokenType="{token_type}"' if token_type else ''
    return (f'<wsse:SecurityTokenReference{attribute}><wsse:Reference URI="{uri}"{attributes}/>'
            '</wsse:SecurityTokenReference>')


def signature(references, key_info, method=MORE + 'rsa-sha256', signature_id='proof', canonicalization=EXCLUSIVE):
    key_info = f'<ds:KeyInfo>{key_info}</ds:KeyInfo>' if key_info is not None else ''
    return (f'<ds:Signature xmlns:ds="{DS}" Id="{signature_id}"><ds:SignedInfo>'
            f'<ds:CanonicalizationMethod Algorithm="{canonicalization}"/><ds:SignatureMethod Algorithm="{method}"/>'
            f'{"".join(references)}</ds:SignedInfo><ds:SignatureValue/>{key_info}</ds:Signature>')


def timestamp(created='2026-01-02T03:04:00.000Z', expires='2026-01-02T03:09:00.000Z', more=''):
    dates = f'<wsu:Created>{created}</wsu:Created>' if created is not None else ''
    dates += f'<wsu:Expires>{expires}</wsu:Expires>' if expires is not None else ''
    return f'<wsu:Timestamp xmlns:wsu="{WSU}" wsu:Id="time">{dates}{more}</wsu:Timestamp>'


def envelope(security, body=BODY, soap=S11, headers='', attributes='', before='', after=''):
    return (f'<s:Envelope xmlns:s="{soap}"><s:Header>{before}<wsse:Security xmlns:wsse="{WSSE}"{attributes}>{security}'
            f'</wsse:Security>{headers}</s:Header><s:Body xmlns:wsu="{WSU}" wsu:Id="body">{body}</s:Body>{after}'
            '</s:Envelope>')


HOLDER = read('tokens/holder-of-key.xml')
BEARER = read('tokens/bearer-minimal.xml')
ID = id_of(HOLDER)
BODY_AND_TIME = [reference('#body'), reference('#time')]


def second_holder():
    """Another token for the same key."""
    template = re.sub(r'(<ds:DigestValue>)[^<]*|(<ds:SignatureValue>)[^<]*', r'\1\2', HOLDER).replace(ID, '_second')
    template = template.replace('<ds:Signature ', '<ds:Signature Id="token" ', 1)
    return run_xmlsec(template, 'tokens/sts-rsa', 'token', [('ID', 'urn:oasis:names:tc:SAML:2.0:assertion:Assertion')])


SECOND = second_holder()


def certificate(name):
    return ''.join(read(name + '.crt').split('-----')[2].split())


def x509_data(name='tokens/holder'):
    return f'<ds:X509Data><ds:X509Certificate>{certificate(name)}</ds:X509Certificate></ds:X509Data>'


def key_value(name='tokens/holder'):
    """The RSA key value of a certificate, by openssl."""
    text = subprocess.run(['openssl', 'x509', '-in', os.path.join(DATA, name + '.crt'), '-noout', '-modulus'],
                          check=True, capture_output=True).stdout.decode()
    octets = bytes.fromhex(text.strip().split('=')[1])
    modulus = subprocess.run(['openssl', 'base64', '-A'], input=octets, check=True, capture_output=True).stdout.decode()
    return ('<ds:KeyValue><ds:RSAKeyValue><ds:Modulus>' + modulus +
            '</ds:Modulus><ds:Exponent>AQAB</ds:Exponent></ds:RSAKeyValue></ds:KeyValue>')


def message(references=None, token=HOLDER, key_info=None, time=None, method=MORE + 'rsa-sha256', key='tokens/holder',
            more='', canonicalization=EXCLUSIVE, **parts):
    """A message that is signed with the token's key."""
    if key_info is None:
        key_info = token_reference(id_of(token))
    made = signature(references or BODY_AND_TIME, None, method, canonicalization=canonicalization)
    signed = sign(envelope((timestamp() if time is None else time) + token + made + more, **parts), key)
    return with_key_info(signed, key_info) if key_info else signed


def with_key_info(signed, key_info):
    """The key information is not signed. It is added afterwards, because xmlsec1 would use a key in it."""
    at = signed.index('</ds:SignatureValue>', signed.index('Id="proof"')) + len('</ds:SignatureValue>')
    return signed[:at] + f'<ds:KeyInfo>{key_info}</ds:KeyInfo>' + signed[at:]


def write(name, text, outcome, reason, options=''):
    with open(os.path.join(HERE, name + '.xml'), 'w', encoding='utf-8', newline='') as file:
        file.write(text)
    ROWS.append('\t'.join([name, options, outcome, reason]))


def accept(name, text, options='', proof='message-signature'):
    write(name, text, 'accepted', proof, options)


def refuse(name, text, reason, outcome='InvalidMessageException', options=''):
    write(name, text, outcome, reason, options)


def change(text, old, new, count=1):
    assert old in text, old
    return text.replace(old, new, count)


def cut(text, begin, end):
    """The part from `begin` to `end`, both included."""
    start = text.index(begin)
    return text[start:text.index(end, start) + len(end)]


GENUINE = message()
SIGNED_BODY = cut(GENUINE, '<s:Body', '</s:Body>')
SIGNED_TIME = cut(GENUINE, '<wsu:Timestamp', '</wsu:Timestamp>')
PROOF = GENUINE[GENUINE.index('<ds:Signature xmlns:ds="' + DS + '" Id="proof"'):GENUINE.index('</wsse:Security>')]
WRONG = 'The signature of the message is wrong: another key made it, or signed content was changed'
NOT_BODY = 'The signature does not cover the body'
NOT_TIME = 'The signature does not cover the timestamp'
UNSIGNED = "The message has no signature by the token's key"
OTHER_TOKEN = 'A signature of the security header refers to another token'
SYNTAX = 'Syntax error in the signature of the message: '
NOT_ACCEPTED = 'The signature of the message is not accepted: '
TO = '<a:To xmlns:a="urn:a" xmlns:wsu="' + WSU + '" wsu:Id="to">urn:service</a:To>'


def genuine():
    accept('genuine-soap11', GENUINE)
    accept('genuine-soap12', message(soap=S12))
    accept('genuine-type-of-dialect',
           message(key_info=token_reference(ID, OASIS + 'oasis-wss-saml-tokenprofile-1.1#SAMLV2.0')))
    accept('genuine-without-type', message(key_info=token_reference(ID, '')))
    accept('genuine-direct-reference', message(key_info=direct_reference('#' + ID)))
    accept('genuine-certificate', message(key_info=x509_data()))
    accept('genuine-key-value', message(key_info=key_value()))
    accept('genuine-certificate-and-key-value', message(key_info=x509_data() + key_value()))
    value_token = read('saml2/holder-rsa-value.xml')
    accept('genuine-token-with-key-value', message(token=value_token), 'saml2')
    accept('genuine-token-with-key-value-by-key-value', message(token=value_token, key_info=key_value()), 'saml2')
    accept('genuine-rsa-sha512', message(method=MORE + 'rsa-sha512'))
    accept('genuine-inclusive', message(canonicalization='http://www.w3.org/TR/2001/REC-xml-c14n-20010315'))
    accept('genuine-envelope-covered', sign(change(
        envelope(timestamp() + HOLDER + signature([reference('#all', (ENVELOPED, EXCLUSIVE))], token_reference(ID))),
        '<s:Envelope ', f'<s:Envelope xmlns:wsu="{WSU}" wsu:Id="all" ')))
    accept('genuine-document-covered', message([reference('', (ENVELOPED, EXCLUSIVE))]))
    accept('genuine-part', message(BODY_AND_TIME + [reference('#to')], headers=TO), 'to')
    accept('genuine-token-covered',
           run_xmlsec(envelope(timestamp() + HOLDER + signature(BODY_AND_TIME + [reference('#' + ID)],
                                                                token_reference(ID))),
                      'tokens/holder', 'proof', IDS + [('ID', 'urn:oasis:names:tc:SAML:2.0:assertion:Assertion')]),
           'token')
    accept('genuine-role', message(attributes=' s:actor="urn:role"'), 'role')
    accept('genuine-without-expires', message(time=timestamp(expires=None)))
    accept('genuine-without-timestamp', message([reference('#body')], time=''), 'no-timestamp')
    accept('genuine-ultimate-receiver', message(soap=S12, attributes=f' s:role="{S12}/role/ultimateReceiver"'))
    accept('genuine-header-for-another-role', change(GENUINE, '<s:Header>', '<s:Header><wsse:Security xmlns:wsse="' +
           WSSE + f'" s:actor="{NEXT}"/>'))
    accept('genuine-other-signature-first',
           change(GENUINE, PROOF, sign_other(GENUINE) + PROOF))
    accept('genuine-comment-in-body', change(GENUINE, '<m:To>alice', '<m:To>al<!-- not signed -->ice'))
    accept('genuine-comment-after-identifier', change(GENUINE, f'>{ID}<', f'>{ID}<!-- --><'))
    accept('bearer', envelope(timestamp() + BEARER), 'bearer', 'bearer')
    accept('tls', envelope(timestamp() + HOLDER), 'tls', 'tls-certificate')


def sign_other(text):
    """A signature over the body by the key of another certificate, which the header contains."""
    token = (f'<wsse:BinarySecurityToken xmlns:wsu="{WSU}" wsu:Id="other" ValueType="{X509}#X509v3">' +
             certificate('tokens/other') + '</wsse:BinarySecurityToken>')
    other = signature([reference('#body')], direct_reference('#other', f' ValueType="{X509}#X509v3"'),
                      signature_id='second')
    signed = sign(change(text, PROOF, token + other), 'tokens/other', 'second')
    return cut(signed, '<wsse:BinarySecurityToken', '</wsse:BinarySecurityToken>') + \
        signed[signed.index('<ds:Signature xmlns:ds="' + DS + '" Id="second"'):signed.index('</wsse:Security>')]


def envelopes():
    refuse('not-xml', 'not XML', 'text comes before the document element at line 1, column 1',
           'XMLParseException')
    refuse('not-soap', HOLDER, 'The document is not a SOAP envelope')
    refuse('other-version', message().replace(S11, 'urn:soap'), 'The envelope is neither of SOAP 1.1 nor of SOAP 1.2')
    neither = 'The envelope has content that is neither its header nor its body'
    refuse('mixed-versions-header', change(change(GENUINE, '<s:Header>', f'<t:Header xmlns:t="{S12}">'), '</s:Header>',
                                           '</t:Header>'),
           neither)
    refuse('mixed-versions-body', change(change(GENUINE, '<s:Body ', f'<t:Body xmlns:t="{S12}" '), '</s:Body>',
                                         '</t:Body>'), neither)
    refuse('no-header', f'<s:Envelope xmlns:s="{S11}"><s:Body/></s:Envelope>',
           'There is no security header for the last receiver')
    refuse('two-headers', change(GENUINE, '<s:Header>', '<s:Header/><s:Header>'), 'The envelope has a second header')
    header = cut(GENUINE, '<s:Header>', '</s:Header>')
    refuse('header-after-body', change(change(GENUINE, header, ''), '</s:Envelope>', header + '</s:Envelope>'),
           'The header of the envelope is after its body')
    refuse('no-body', change(GENUINE, SIGNED_BODY, ''), 'The envelope has no body')
    refuse('two-bodies', change(GENUINE, '</s:Envelope>', f'<s:Body>{FORGED}</s:Body></s:Envelope>'),
           'The envelope has a second body')
    refuse('two-bodies-forged-first', change(GENUINE, '</s:Header>', f'</s:Header><s:Body>{FORGED}</s:Body>'),
           'The envelope has a second body')
    refuse('trailer', change(GENUINE, '</s:Envelope>', '<x/></s:Envelope>'),
           neither)
    refuse('text-in-envelope', change(GENUINE, '</s:Envelope>', 'text</s:Envelope>'),
           neither)


def security_headers():
    two = 'There are two security headers for the last receiver'
    security = cut(GENUINE, '<wsse:Security ', '</wsse:Security>')
    refuse('two-security-headers', change(GENUINE, '</s:Header>', security + '</s:Header>'), two)
    refuse('two-security-headers-empty-actor',
           change(GENUINE, '</s:Header>', f'<wsse:Security xmlns:wsse="{WSSE}" s:actor=""/></s:Header>'), two)
    refuse('two-security-headers-ultimate-receiver', change(message(soap=S12), '</s:Header>',
           f'<wsse:Security xmlns:wsse="{WSSE}" s:role="{S12}/role/ultimateReceiver"/></s:Header>'), two)
    refuse('security-for-another-role', message(attributes=f' s:actor="{NEXT}"'),
           'There is no security header for the last receiver')
    refuse('no-security-for-the-role', GENUINE, 'There is no security header for the role "urn:role"', options='role')
    refuse('security-of-another-namespace', change(GENUINE, f'xmlns:wsse="{WSSE}"', 'xmlns:wsse="urn:wsse"'),
           'There is no security header for the last receiver')
    refuse('security-nested', change(change(GENUINE, '<wsse:Security ', '<x><wsse:Security '), '</wsse:Security>',
                                     '</wsse:Security></x>'), 'There is no security header for the last receiver')
    refuse('security-in-body', change(change(GENUINE, security, ''), BODY, BODY + security),
           'There is no security header for the last receiver')
    refuse('forged-header-for-the-role', change(
        message(attributes=f' s:actor="{NEXT}"'), '</s:Header>', f'<wsse:Security xmlns:wsse="{WSSE}">' +
        timestamp().replace('"time"', '"second"') + f'{SECOND}</wsse:Security></s:Header>'), UNSIGNED,
        'InvalidProofException')


def timestamps():
    stale = 'StaleMessageException'
    refuse('no-timestamp', message([reference('#body')], time=''), 'The security header has no timestamp')
    refuse('two-timestamps', change(GENUINE, SIGNED_TIME, SIGNED_TIME + timestamp().replace('"time"', '"second"')),
           'The security header has two timestamps')
    refuse('two-timestamps-fresh-first', change(GENUINE, SIGNED_TIME, timestamp().replace('"time"', '"second"') +
                                                SIGNED_TIME), 'The security header has two timestamps')
    refuse('no-created', message(time=timestamp(created=None)), 'The timestamp has no Created')
    refuse('two-created', message(time=timestamp(more='<wsu:Created>2026-01-02T03:04:00Z</wsu:Created>')),
           'The timestamp has two elements Created')
    refuse('two-expires', message(time=timestamp(more='<wsu:Expires>2027-01-02T03:04:00Z</wsu:Expires>')),
           'The timestamp has two elements Expires')
    refuse('timestamp-with-other-content', message(time=timestamp(more='<x/>')),
           'The timestamp has content other than Created and Expires')
    refuse('timestamp-with-text', message(time=timestamp(more='x')),
           'The timestamp has content other than Created and Expires')
    refuse('created-is-no-date', message(time=timestamp('yesterday')), 'The Created of the timestamp is not a date')
    refuse('created-with-blank', message(time=timestamp(' 2026-01-02T03:04:00Z')),
           'The Created of the timestamp is not a date')
    refuse('expires-is-no-date', message(time=timestamp(expires='2026-02-30T00:00:00Z')),
           'The Expires of the timestamp is not a date')
    split = "Element 'wsu:Expires' must only have textual content (but has extra children or is empty)."
    refuse('expires-with-comment', message(time=timestamp(expires='2026-01-02T03:09:00<!-- -->.000Z')), split)
    refuse('expires-with-instruction', message(time=timestamp(expires='2026-01-02T03:09:00<?x?>.000Z')), split)
    refuse('expires-empty', message(time=timestamp(expires='')), split)
    refuse('expires-before-created', message(time=timestamp(expires='2026-01-02T03:03:00Z')),
           'The timestamp expires before it is created')
    refuse('expires-at-created', message(time=timestamp(expires='2026-01-02T03:04:00Z')),
           'The timestamp expires before it is created')
    refuse('created-in-the-future', message(time=timestamp('2026-01-02T03:05:06Z')),
           'The message was created in the future: 2026-01-02T03:05:06.000Z', stale)
    accept('created-within-the-tolerance', message(time=timestamp('2026-01-02T03:05:05Z')))
    refuse('created-too-long-ago', message(time=timestamp('2026-01-02T02:58:05Z', '2036-01-01T00:00:00Z')),
           'The message is too old. It was created at: 2026-01-02T02:58:05.000Z', stale)
    refuse('expired', message(time=timestamp('2026-01-02T03:02:00Z', '2026-01-02T03:03:05Z')),
           'The message has expired at: 2026-01-02T03:03:05.000Z', stale)
    accept('expired-within-the-tolerance', message(time=timestamp('2026-01-02T03:02:00Z', '2026-01-02T03:03:06Z')))
    fresh = timestamp().replace('"time"', '"second"')
    refuse('timestamp-moved-out', change(change(GENUINE, SIGNED_TIME, ''), '<s:Header>', '<s:Header>' + SIGNED_TIME),
           'The security header has no timestamp')
    refuse('timestamp-replaced', change(change(GENUINE, SIGNED_TIME, fresh), '<s:Header>', '<s:Header>' + SIGNED_TIME),
           NOT_TIME)
    refuse('timestamp-not-signed', message([reference('#body')]), NOT_TIME)
    refuse('timestamp-refreshed', change(GENUINE, '2026-01-02T03:09', '2026-01-02T04:09'), WRONG,
           'InvalidProofException')


def tokens():
    refuse('no-token', change(GENUINE, HOLDER, ''), 'The security header has no SAML 2.0 token')
    refuse('two-tokens', change(GENUINE, HOLDER, HOLDER + SECOND), 'The security header has two SAML 2.0 tokens')
    refuse('two-tokens-other-first', change(GENUINE, HOLDER, SECOND + HOLDER),
           'The security header has two SAML 2.0 tokens')
    refuse('token-in-header', change(change(GENUINE, HOLDER, ''), '<s:Header>', '<s:Header>' + HOLDER),
           'The security header has no SAML 2.0 token')
    tampered = 'Failed to verify signature: token might have been tampered with.'
    refuse('token-changed', change(GENUINE, 'alice@corp.example', 'mallory@corp.example'), tampered,
           'InvalidSignatureException')
    refuse('token-of-another-issuer', message(token=read('tokens/signed-by-other.xml'), key_info=token_reference(
        id_of(read('tokens/signed-by-other.xml')))), tampered, 'InvalidSignatureException')
    refuse('token-expired', message(token=read('tokens/expired.xml')),
           'The token has expired at: ' + re.search(r'NotOnOrAfter="([^"]+)"', re.search(
               r'<saml:Conditions[^>]*>', read('tokens/expired.xml')).group(0)).group(1), 'ParseException')
    unbound = change(GENUINE, '<saml:Issuer ', '<saml:Issuer unbound:a="" ')
    refuse('token-without-canonical-form', unbound, 'The token of the message is not accepted: No canonical form: the '
           'prefix "unbound" is not bound at ' + line_and_column(unbound, '<saml:Issuer '))
    refuse('token-identifier-twice', change(GENUINE, '<s:Header>', f'<s:Header><x ID="{ID}"/>'),
           f'Signature verification error. The reference URI "#{ID}" is not accepted: several elements have that '
           'identifier', 'InvalidSignatureException')


def proofs():
    proof = 'InvalidProofException'
    refuse('no-signature', envelope(timestamp() + HOLDER), UNSIGNED, proof)
    refuse('tls-by-another-key', envelope(timestamp() + HOLDER),
           UNSIGNED + ', and the key of the TLS certificate is another key', proof, 'tls-other')
    refuse('tls-and-wrong-signature', change(GENUINE, 'alice', 'mallory', 99).replace(
        'mallory@corp.example', 'alice@corp.example'), WRONG, proof, 'tls')
    refuse('bearer-not-accepted', envelope(timestamp() + BEARER),
           'The token is a bearer token, with which its sender proves nothing', proof)
    refuse('bearer-signed', message(token=BEARER),
           'A signature refers to the token, which is a bearer token and has no key', proof, 'bearer')
    refuse('another-key', message(key='tokens/other'), WRONG, proof)
    refuse('another-key-with-its-certificate', message(key='tokens/other', key_info=x509_data('tokens/other')),
           UNSIGNED, proof)
    refuse('another-key-with-its-key-value', message(key='tokens/other', key_info=key_value('tokens/other')), UNSIGNED,
           proof)
    refuse('another-key-with-both-certificates',
           message(key='tokens/other', key_info=x509_data('tokens/other') + x509_data()), UNSIGNED, proof)
    refuse('another-key-with-the-certificate', message(key='tokens/other', key_info=x509_data()), WRONG, proof)
    refuse('another-key-in-binary-token', change(GENUINE, PROOF, sign_other(GENUINE)), UNSIGNED, proof)
    refuse('signature-in-body', change(change(GENUINE, PROOF, ''), BODY, BODY + PROOF), UNSIGNED, proof)
    refuse('signature-nested', change(GENUINE, PROOF, f'<x>{PROOF}</x>'), UNSIGNED, proof)
    refuse('certificate-and-broken-key-value', message(key_info=x509_data() + change(key_value(), '<ds:Modulus>',
                                                                                     '<ds:Modulus>!')), UNSIGNED, proof)
    refuse('no-key-info', message(key_info=False), UNSIGNED, proof)
    refuse('key-info-empty', change(GENUINE, cut(PROOF, '<ds:KeyInfo>', '</ds:KeyInfo>'), '<ds:KeyInfo/>'), UNSIGNED,
           proof)
    info = cut(PROOF, '<ds:KeyInfo>', '</ds:KeyInfo>')
    twice = change(GENUINE, info, info + info)
    refuse('key-info-twice', twice, SYNTAX + 'Unexpected element "ds:KeyInfo" in "ds:Signature" at ' +
           line_and_column(twice, info + '</ds:Signature>'), proof)
    refuse('key-info-names-another-token', message(key_info=token_reference('_second')), OTHER_TOKEN)
    refuse('key-info-names-longer-identifier', message(key_info=token_reference(ID + 'x')), OTHER_TOKEN)
    refuse('key-info-identifier-split', message(key_info=token_reference(ID[:5] + '<!-- -->' + ID[5:])), OTHER_TOKEN)
    refuse('key-info-names-saml-1', message(key_info=token_reference(
        ID, '', OASIS + 'oasis-wss-saml-token-profile-1.0#SAMLAssertionID')), OTHER_TOKEN)
    refuse('key-info-of-type-saml-1', message(key_info=token_reference(ID, SAML_PROFILE + '#SAMLV1.1')), OTHER_TOKEN)
    refuse('key-info-of-type-certificate', message(key_info=token_reference(ID, X509 + '#X509v3')), OTHER_TOKEN)
    refuse('key-info-refers-to-another-token', message(key_info=direct_reference(
        '#_second', '', SAML_PROFILE + '#SAMLV2.0')), OTHER_TOKEN)
    refuse('key-info-embeds-another-token', message(key_info='<wsse:SecurityTokenReference><wsse:Embedded>' + SECOND +
                                                    '</wsse:Embedded></wsse:SecurityTokenReference>'), OTHER_TOKEN)
    refuse('key-info-names-two-tokens', message(key_info=token_reference(ID) + token_reference('_second')), OTHER_TOKEN)
    refuse('key-info-names-token-and-key', message(key_info=token_reference(ID) + x509_data('tokens/other')),
           'A signature refers to the token and to something else')
    refuse('key-info-names-token-and-name', message(key_info=token_reference(ID) + '<ds:KeyName>n</ds:KeyName>'),
           'A signature refers to the token and to something else')
    refuse('key-info-with-external-uri', message(key_info=direct_reference('http://example.com/' + ID)), UNSIGNED,
           proof)
    refuse('two-proofs', change(GENUINE, PROOF, PROOF + PROOF.replace('Id="proof"', 'Id="again"')),
           'Two signatures refer to the token')
    refuse('foreign-proof-and-proof', change(GENUINE, PROOF, PROOF + message(key_info=token_reference('_second')).split(
        HOLDER)[1].split('</wsse:Security>')[0].replace('Id="proof"', 'Id="again"')), OTHER_TOKEN)
    refuse('many-signatures', change(GENUINE, PROOF, PROOF + f'<ds:Signature xmlns:ds="{DS}"/>' * 10),
           'The security header has more than 10 signatures')
    refuse('value-changed', change(GENUINE, PROOF, flip(PROOF)), WRONG, proof)
    missing = change(GENUINE, PROOF, change(PROOF, cut(PROOF, '<ds:SignatureValue>', '</ds:SignatureValue>'), ''))
    refuse('value-missing', missing, SYNTAX + 'Expected ds:SignatureValue in "ds:Signature", but found ' +
           '"ds:KeyInfo" at ' + line_and_column(missing, info + '</ds:Signature>'), proof)


def flip(text):
    at = text.index('<ds:SignatureValue>') + 30
    return text[:at] + ('A' if text[at] != 'A' else 'B') + text[at + 1:]


def line_and_column(text, part):
    before = text[:text.index(part)].encode()
    return f'line {before.count(10) + 1}, column {len(before) - before.rfind(10)}'


def profile():
    proof = 'InvalidProofException'
    sha1 = MORE.replace('2001/04/xmldsig-more', '2000/09/xmldsig')
    refuse('method-rsa-sha1', message(method=sha1 + 'rsa-sha1'), NOT_ACCEPTED +
           f'The signature algorithm "{sha1}rsa-sha1" is not accepted', proof)
    refuse('digest-sha1', message([reference('#body', digest=sha1 + 'sha1'), reference('#time')]), NOT_ACCEPTED +
           f'The digest algorithm "{sha1}sha1" is not accepted', proof)
    str_transform = OASIS + '2004/01/oasis-200401-wss-soap-message-security-1.0#STR-Transform'
    xpath = 'http://www.w3.org/TR/1999/REC-xpath-19991116'
    for name, uri, content in (('str', str_transform, ''), ('xpath', xpath, '<ds:XPath>false()</ds:XPath>')):
        at = GENUINE.index('#body"')
        refuse('transform-' + name, GENUINE[:at] + change(GENUINE[at:], f'<ds:Transform Algorithm="{EXCLUSIVE}"/>',
               f'<ds:Transform Algorithm="{uri}">{content}</ds:Transform>'), NOT_ACCEPTED +
               f'The transform algorithm "{uri}" is not accepted', proof)
    refuse('object', change(GENUINE, PROOF, change(PROOF, '</ds:Signature>', '<ds:Object/></ds:Signature>')),
           NOT_ACCEPTED + 'A signature with ds:Object is not accepted', proof)
    refuse('reference-external', change(GENUINE, 'URI="#body"', 'URI="cid:body"'),
           NOT_ACCEPTED + 'The reference URI "cid:body" is not accepted: it points outside the document', proof)
    refuse('reference-without-target', change(GENUINE, 'wsu:Id="body"', 'wsu:Id="bodies"'),
           NOT_ACCEPTED + 'The reference URI "#body" is not accepted: no element has that identifier', proof)
    refuse('enveloped-without-envelope', message().replace(
        f'URI="#body"><ds:Transforms><ds:Transform Algorithm="{EXCLUSIVE}"/>',
        f'URI="#body"><ds:Transforms><ds:Transform Algorithm="{ENVELOPED}"/><ds:Transform Algorithm="{EXCLUSIVE}"/>'),
        NOT_ACCEPTED + 'The reference URI "#body" has the enveloped-signature transform, but does not envelop the '
        'signature', proof)


def wrapping():
    proof = 'InvalidProofException'
    forged = SIGNED_BODY.replace('alice', 'mallory')
    other = forged.replace('"body"', '"forged"')
    without = forged.replace(' wsu:Id="body"', '')
    twice = NOT_ACCEPTED + 'The reference URI "#body" is not accepted: several elements have that identifier'
    places = {
        'header': ('<s:Header>', '<s:Header>', ''), 'header-block': ('<s:Header>', '<s:Header><x>', '</x>'),
        'security': ('</wsse:Security>', '', '</wsse:Security>'),
        'unknown-security': ('</wsse:Security>', '<x>', '</x></wsse:Security>'),
        'proof': ('</ds:KeyInfo></ds:Signature></wsse:Security>', '', '</ds:KeyInfo></ds:Signature></wsse:Security>'),
    }
    for place, (old, before, after) in places.items():
        for kind, body in (('same-identifier', forged), ('other-identifier', other), ('no-identifier', without)):
            moved = change(change(GENUINE, SIGNED_BODY, body), old, before + SIGNED_BODY + after)
            if place == 'proof':
                refuse(f'wrap-body-in-{place}-{kind}', moved, 'A signature refers to the token and to something else')
            elif kind == 'same-identifier':
                refuse(f'wrap-body-in-{place}-{kind}', moved, twice, proof)
            else:
                refuse(f'wrap-body-in-{place}-{kind}', moved, NOT_BODY)
    inside = change(other, '</s:Body>', SIGNED_BODY + '</s:Body>')
    refuse('wrap-body-in-body', change(GENUINE, SIGNED_BODY, inside), NOT_BODY)
    refuse('wrap-envelope-in-header', f'<s:Envelope xmlns:s="{S11}"><s:Header>' + GENUINE + '</s:Header>' + without +
           '</s:Envelope>', 'There is no security header for the last receiver')
    refuse('wrap-envelope-in-body', f'<s:Envelope xmlns:s="{S11}"><s:Body>' + GENUINE + '</s:Body></s:Envelope>',
           'There is no security header for the last receiver')
    security = cut(GENUINE, '<wsse:Security ', '</wsse:Security>')
    refuse('wrap-old-message', f'<s:Envelope xmlns:s="{S11}"><s:Header>{security}<x>{SIGNED_BODY}</x></s:Header>' +
           without + '</s:Envelope>', NOT_BODY)
    for attribute in ('ID', 'Id', 'xml:id'):
        name = attribute.replace(':', '-')
        named = without.replace('<s:Body', f'<s:Body {attribute}="body"')
        refuse(f'wrap-body-named-by-{name}', change(change(GENUINE, SIGNED_BODY, named), '<s:Header>', '<s:Header>' +
                                                    SIGNED_BODY), twice, proof)
        refuse(f'identifier-in-body-as-{name}', change(GENUINE, '<m:Pay ', f'<m:Pay {attribute}="body" '), twice, proof)
    refuse('wrap-content-only', message([reference('#pay'), reference('#time')],
                                        body=change(BODY, '<m:Pay ', f'<m:Pay xmlns:wsu="{WSU}" wsu:Id="pay" ')),
           NOT_BODY)
    refuse('body-not-signed', message([reference('#time')]), NOT_BODY)
    refuse('body-changed', change(GENUINE, '>10<', '>9999<'), WRONG, proof)
    refuse('body-extended', change(GENUINE, '</m:Pay>', '</m:Pay>' + FORGED), WRONG, proof)
    refuse('only-header-signed', sign(change(envelope(timestamp() + HOLDER + signature(
        [reference('#head', (ENVELOPED, EXCLUSIVE))], token_reference(ID))), '<s:Header>',
        f'<s:Header xmlns:wsu="{WSU}" wsu:Id="head">')), NOT_BODY)
    part = message(BODY_AND_TIME + [reference('#to')], headers=TO)
    forged_part = TO.replace('urn:service', 'urn:other')
    missing = "The message has no header block '{urn:a}To'"
    refuse('part-missing', GENUINE, missing, options='to')
    refuse('part-not-signed', message(headers=TO), "The signature does not cover the header block '{urn:a}To'",
           options='to')
    signed_part = cut(part, '<a:To ', '</a:To>')
    refuse('part-twice', change(part, signed_part, signed_part + forged_part.replace('"to"', '"second"')),
           "The message has two header blocks '{urn:a}To'", options='to')
    refuse('part-wrapped', change(part, signed_part, forged_part.replace('"to"', '"second"') + f'<x>{signed_part}</x>'),
           "The signature does not cover the header block '{urn:a}To'", options='to')
    refuse('part-moved-into-body', change(change(part, signed_part, ''), BODY, BODY + signed_part), WRONG, proof, 'to')
    refuse('token-not-covered', GENUINE, 'The signature does not cover the token', options='token')
    refuse('token-exchanged', change(GENUINE, HOLDER, SECOND).replace(f'>{ID}<', '>_second<'),
           'The signature does not cover the token', options='token')


def main():
    for group in (genuine, envelopes, security_headers, timestamps, tokens, proofs, profile, wrapping):
        group()
    with open(os.path.join(HERE, 'expected.tsv'), 'w', encoding='utf-8') as file:
        file.write('\n'.join(sorted(ROWS)) + '\n')


if __name__ == '__main__':
    main()
