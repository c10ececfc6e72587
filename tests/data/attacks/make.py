#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes the hostile documents of this folder from the token fixtures in the folders tokens and saml2.

Most are a genuine token that an attacker changed after the service had signed it; some are signed, with openssl and
xmlsec1, by a key that is not trusted, or by the trusted key with an algorithm or with content that an attacker chose. The
expected outcome of each is in expected.tsv; expected-saml2.tsv has the outcomes that differ in the profile SAML2.

usage: make.py [GROUP...]   GROUP is one of the functions listed at the end of this file; all of them by default. Some
documents differ from run to run, because a key is made for them.
"""
import base64
import os
import re
import subprocess
import sys
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
TOKENS = os.path.join(HERE, '..', 'tokens')
ASSERTION = 'urn:oasis:names:tc:SAML:2.0:assertion:Assertion'
DS = 'http://www.w3.org/2000/09/xmldsig#'
MORE = 'http://www.w3.org/2001/04/xmldsig-more#'
EXCLUSIVE = 'http://www.w3.org/2001/10/xml-exc-c14n#'
WSU = 'http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd'


def token(name):
    """A signed token fixture without its XML declaration."""
    with open(os.path.join(TOKENS, name + '.xml'), encoding='utf-8') as file:
        return re.sub(r'^<\?xml[^>]*\?>\n', '', file.read())


def write(name, text):
    with open(os.path.join(HERE, name + '.xml'), 'w', encoding='utf-8', newline='') as file:
        file.write(text)


def change(text, old, new, count=1):
    """`text` with `old` replaced; without `old` there would be no attack."""
    assert old in text, old
    return text.replace(old, new, count)


def run(*command, stdin=None):
    return subprocess.run(command, input=stdin, check=True, capture_output=True).stdout


def key(name):
    return os.path.join(TOKENS, name)


def sign(template, signer='sts-rsa', *options):
    """`template` signed by xmlsec1, without an XML declaration."""
    keys = options or ('--privkey-pem', f'{key(signer)}.key,{key(signer)}.crt')
    with tempfile.TemporaryDirectory() as folder:
        source = os.path.join(folder, 'in.xml')
        with open(source, 'w', encoding='utf-8') as file:
            file.write(template)
        signed = run('xmlsec1', '--sign', *keys, '--id-attr:ID', ASSERTION, source).decode()
    return re.sub(r'^<\?xml[^>]*\?>\n', '', signed)


SIGNATURE = re.compile(r'<ds:Signature .*?</ds:Signature>', re.S)


def blank(text):
    """A signed token turned into a template: without digest, signature value and certificate."""
    text = re.sub(r'<ds:DigestValue>[^<]*</ds:DigestValue>', '<ds:DigestValue/>', text)
    text = re.sub(r'<ds:SignatureValue>[^<]*</ds:SignatureValue>', '<ds:SignatureValue/>', text)
    signature = SIGNATURE.search(text).group()
    bare = re.sub(r'<ds:X509Certificate>[^<]*</ds:X509Certificate>', '<ds:X509Certificate/>', signature)
    return text.replace(signature, bare)


bearer = token('bearer')
ID = re.search(r' ID="([^"]*)"', bearer).group(1)
signature = SIGNATURE.search(bearer).group()
unsigned = bearer.replace(signature, '').strip()
bearer = bearer.strip()
# The token that the attacker wants has another subject: once with the genuine ID, and once with another ID.
forged = change(unsigned, 'alice@corp.example', 'admin@corp.example')
forged_other_id = forged.replace(ID, '_forged')


def put_signature(assertion, new_signature):
    return change(assertion, '</saml:Issuer>', '</saml:Issuer>' + new_signature)


def into_signature(element):
    return change(signature, '</ds:Signature>', f'<ds:Object>{element}</ds:Object></ds:Signature>')


def into_key_info(element):
    return change(signature, '</ds:KeyInfo>', element + '</ds:KeyInfo>')


def wrapping():
    """The genuine assertion stays where its digest is right, and the reader is shown another one."""
    for name, evil in (('same-id', forged), ('other-id', forged_other_id)):
        write(f'wrap-original-in-object-{name}', put_signature(evil, into_signature(unsigned)))
        write(f'wrap-signed-original-in-object-{name}', put_signature(evil, into_signature(bearer)))
        write(f'wrap-original-in-keyinfo-{name}', put_signature(evil, into_key_info(unsigned)))
        write(f'wrap-original-in-advice-{name}', change(
            put_signature(evil, signature), '<saml:AuthnStatement', f'<saml:Advice>{unsigned}</saml:Advice><saml:AuthnStatement'))
        write(f'wrap-original-in-rsa-advice-{name}', change(
            put_signature(evil, signature), '<saml:AuthnStatement',
            '<saml:Advice><rsa:RSAAdvice xmlns:rsa="http://www.rsa.com/names/2009/12/std-ext/SAML2.0" AdviceSource="x">'
            f'{unsigned}</rsa:RSAAdvice></saml:Advice><saml:AuthnStatement'))
        write(f'wrap-original-in-extensions-{name}', change(
            put_signature(evil, signature), '<saml:Subject>', f'<saml:Extensions>{unsigned}</saml:Extensions><saml:Subject>'))
        write(f'wrap-original-in-conditions-{name}', change(
            put_signature(evil, signature), '</saml:Conditions>', f'{unsigned}</saml:Conditions>'))
        write(f'wrap-original-in-confirmation-data-{name}', re.sub(
            r'(<saml:SubjectConfirmationData [^>]*)/>', lambda m: f'{m.group(1)}>{unsigned}</saml:SubjectConfirmationData>',
            put_signature(evil, signature)))
        write(f'wrap-original-in-attribute-value-{name}', change(
            put_signature(evil, signature), '<saml:AttributeValue>Alice', f'<saml:AttributeValue>{unsigned}'))
        write(f'wrap-original-at-end-{name}', change(
            put_signature(evil, signature), '</saml:Assertion>', f'{unsigned}</saml:Assertion>'))
        write(f'wrap-signed-original-at-end-{name}', change(evil, '</saml:Assertion>', f'{bearer}</saml:Assertion>'))
        write(f'wrap-signed-original-as-signature-{name}', put_signature(evil, bearer))
        write(f'wrap-siblings-{name}',
              f'<envelope>{put_signature(evil, signature)}{unsigned}</envelope>')
        write(f'wrap-siblings-reversed-{name}',
              f'<envelope>{unsigned}{put_signature(evil, signature)}</envelope>')
        write(f'wrap-signed-siblings-{name}', f'<envelope>{put_signature(evil, signature)}{bearer}</envelope>')
    # A reference that covers the whole document, in a document that was extended around it.
    empty_uri = token('reference-empty-uri').strip()
    write('wrap-empty-uri-in-envelope', f'<envelope>{empty_uri}</envelope>')
    # The genuine token and its signature as siblings in the genuine token.
    write('signature-last', change(unsigned, '</saml:Assertion>', f'{signature}</saml:Assertion>'))
    write('signature-first', change(unsigned, '<saml:Issuer', f'{signature}<saml:Issuer'))
    write('signature-in-subject', change(unsigned, '<saml:Subject>', f'<saml:Subject>{signature}'))
    write('signature-after-root-in-envelope', f'<envelope>{unsigned}{signature}</envelope>')
    write('signature-twice', put_signature(bearer, signature))
    write('signature-nested-in-signature', put_signature(unsigned, change(
        signature, '<ds:KeyInfo>', f'<ds:KeyInfo>{signature}')))


def duplicate_ids():
    """A second element to which the reference could resolve, by each attribute that can be an identifier."""
    attributes = {'ID': f'ID="{ID}"', 'Id': f'Id="{ID}"', 'wsu-Id': f'xmlns:wsu="{WSU}" wsu:Id="{ID}"',
                  'xml-id': f'xml:id="{ID}"'}
    for name, attribute in attributes.items():
        write(f'duplicate-{name}-in-keyinfo', put_signature(unsigned, into_key_info(
            f'<ds:KeyName {attribute}>x</ds:KeyName>')))
        write(f'duplicate-{name}-on-keyinfo', put_signature(unsigned, change(
            signature, '<ds:KeyInfo>', f'<ds:KeyInfo {attribute}>')))
        write(f'duplicate-{name}-in-envelope-before', f'<envelope><x {attribute}/>{bearer}</envelope>')
        write(f'duplicate-{name}-in-envelope-after', f'<envelope>{bearer}<x {attribute}/></envelope>')
        write(f'duplicate-{name}-on-envelope', f'<envelope {attribute}>{bearer}</envelope>')
        write(f'second-{name}-on-assertion', change(bearer, f' ID="{ID}"', f' ID="{ID}" {attribute}')
              if name != 'ID' else change(bearer, f' ID="{ID}"', f' ID="{ID}" ID="{ID}"'))


def entities():
    laughs = ''.join(f'<!ENTITY l{i} "{f"&l{i-1};" * 10}">' for i in range(1, 10))
    doctype = {
        'billion-laughs': f'<!ENTITY l0 "ha">{laughs}',
        'quadratic-blowup': f'<!ENTITY l9 "{"a" * 20000}">',
        'external-entity': '<!ENTITY l9 SYSTEM "file:///etc/passwd">',
        'external-http-entity': '<!ENTITY l9 SYSTEM "http://127.0.0.1:9/x">',
        'parameter-entity': '<!ENTITY % p SYSTEM "file:///etc/passwd"> %p; <!ENTITY l9 "x">',
        'internal-entity': '<!ENTITY l9 "alice">',
    }
    for name, subset in doctype.items():
        write(f'dtd-{name}', f'<!DOCTYPE saml:Assertion [{subset}]>\n'
              + change(bearer, 'alice@corp.example', '&l9;@corp.example'))
    write('dtd-empty', '<!DOCTYPE saml:Assertion>\n' + bearer)
    write('dtd-external-subset', '<!DOCTYPE saml:Assertion SYSTEM "file:///etc/passwd">\n' + bearer)
    write('dtd-public', '<!DOCTYPE saml:Assertion PUBLIC "-//x//y" "http://127.0.0.1:9/x.dtd">\n' + bearer)
    write('dtd-attribute-default',
          '<!DOCTYPE saml:Assertion [<!ATTLIST saml:Audience Extra CDATA "x">]>\n' + bearer)
    write('dtd-id-attribute', '<!DOCTYPE saml:Assertion [<!ATTLIST saml:Subject Mine ID #IMPLIED>]>\n'
          + change(bearer, '<saml:Subject>', f'<saml:Subject Mine="{ID}">'))
    write('dtd-notation', '<!DOCTYPE saml:Assertion [<!NOTATION n SYSTEM "n">]>\n' + bearer)
    write('entity-undefined', change(bearer, 'alice@', '&alice;@'))
    write('entity-undefined-in-attribute', change(bearer, 'Version="2.0"', 'Version="&two;"'))
    write('character-reference-to-nul', change(bearer, 'alice@', '&#0;@'))
    write('character-reference-out-of-range', change(bearer, 'alice@', '&#x110000;@'))
    write('encoding-utf-16-declared', '<?xml version="1.0" encoding="UTF-16"?>\n' + bearer)
    write('encoding-utf-7-declared', '<?xml version="1.0" encoding="UTF-7"?>\n' + bearer)
    write('encoding-latin-1-declared', '<?xml version="1.0" encoding="ISO-8859-1"?>\n' + bearer)


def splitting():
    """The service signed a longer name; a reader that uses only the first text would see a shorter one."""
    template = blank(change(bearer, 'alice@corp.example', 'admin@corp.example.evil.test'))
    signed = sign(template)
    split = 'admin@corp.example{}.evil.test'
    whole = split.format('')
    write('split-comment', change(signed, whole, split.format('<!---->')))
    write('split-comment-first', change(signed, whole, 'admin@<!-- -->corp.example.evil.test'))
    write('split-processing-instruction', change(signed, whole, split.format('<?x?>')))
    write('split-processing-instruction-signed', sign(change(template, whole, split.format('<?x?>'))))
    write('split-element', change(signed, whole, split.format('<x/>')))
    write('split-cdata', change(signed, whole, 'admin@corp.example<![CDATA[.evil.test]]>'))
    write('split-comment-in-group', change(bearer, r'corp.example\Users', r'corp.example\Users<!-- -->X'))
    write('split-comment-in-audience', change(bearer, 'https://files.corp.example/', 'https://files<!-- -->.corp.example/'))


def namespaces():
    saml = 'urn:oasis:names:tc:SAML:2.0:assertion'
    write('namespace-conditions-rebound', change(bearer, '<saml:Conditions', '<saml:Conditions xmlns:saml="urn:evil"'))
    write('namespace-assertion-saml-1', bearer.replace(saml, 'urn:oasis:names:tc:SAML:1.0:assertion'))
    write('namespace-assertion-none', change(bearer, f' xmlns:saml="{saml}"', ''))
    write('namespace-signature-rebound', change(bearer, f'xmlns:ds="{DS}"', 'xmlns:ds="urn:evil"'))
    write('namespace-prefix-unbound-on-subject', change(bearer, '<saml:Subject>', '<saml:Subject xmlns:saml="">'))
    write('namespace-unused-declaration', change(bearer, '<saml:Subject>', '<saml:Subject xmlns:x="urn:x">'))
    write('namespace-unused-declaration-inclusive', change(
        token('c14n-inclusive'), '<saml:Subject>', '<saml:Subject xmlns:x="urn:x">'))
    write('namespace-relative', change(bearer, '<saml:Subject>', '<saml:Subject xmlns:x="relative">'))
    write('namespace-xml-rebound', change(bearer, '<saml:Subject>', '<saml:Subject xmlns:xml="urn:x">'))
    write('namespace-xmlns-bound', change(bearer, '<saml:Subject>', '<saml:Subject xmlns:xmlns="urn:x">'))
    full = token('full')
    # With exclusive canonicalisation, the declaration of a prefix is not signed if only the value of xsi:type uses it.
    write('namespace-renew-type-rebound', change(
        full, 'xmlns:rsa="http://www.rsa.com/names/2009/12/std-ext/SAML2.0" xsi:type', 'xmlns:rsa="urn:evil" xsi:type'))
    write('namespace-delegation-type-rebound', change(
        full, 'xmlns:del="urn:oasis:names:tc:SAML:2.0:conditions:delegation" xsi:type', 'xmlns:del="urn:evil" xsi:type'))
    write('namespace-xsi-rebound', full.replace('http://www.w3.org/2001/XMLSchema-instance', 'urn:evil'))


def algorithms():
    template = blank(bearer)
    rsa_sha256, sha256 = MORE + 'rsa-sha256', 'http://www.w3.org/2001/04/xmlenc#sha256'
    enveloped = f'<ds:Transform Algorithm="{DS}enveloped-signature"/>'
    exclusive = f'<ds:Transform Algorithm="{EXCLUSIVE}"/>'

    with tempfile.NamedTemporaryFile() as public_key:
        public_key.write(run('openssl', 'x509', '-in', key('sts-rsa.crt'), '-noout', '-pubkey'))
        public_key.flush()
        for name, uri in (('hmac-sha1', DS + 'hmac-sha1'), ('hmac-sha256', MORE + 'hmac-sha256')):
            hmac = re.sub(r'<ds:KeyInfo>.*?</ds:KeyInfo>', '', change(template, rsa_sha256, uri), flags=re.S)
            write(f'method-{name}', sign(hmac, '', '--hmackey', public_key.name))
    write('method-rsa-sha1', sign(change(template, rsa_sha256, DS + 'rsa-sha1')))
    write('method-rsa-sha224', sign(change(template, rsa_sha256, MORE + 'rsa-sha224')))
    # Nothing is signed here with these algorithms; their names must be enough to refuse them.
    for name, uri in (('rsa-md5', MORE + 'rsa-md5'), ('dsa-sha1', DS + 'dsa-sha1'), ('none', 'none'), ('empty', ''),
                      ('unknown', 'urn:unknown'), ('ecdsa-sha1', MORE + 'ecdsa-sha1'),
                      ('rsa-pss-parameters', 'http://www.w3.org/2007/05/xmldsig-more#rsa-pss'),
                      ('with-blank', rsa_sha256 + ' ')):
        write(f'method-{name}', change(bearer, rsa_sha256, uri))
    write('method-ecdsa-with-rsa-key', change(bearer, rsa_sha256, MORE + 'ecdsa-sha256'))
    write('method-pss-with-pkcs1-value', change(bearer, rsa_sha256, 'http://www.w3.org/2007/05/xmldsig-more#sha256-rsa-MGF1'))
    write('method-missing', re.sub(r'<ds:SignatureMethod [^>]*/>', '', bearer))
    write('method-without-algorithm', re.sub(r'<ds:SignatureMethod [^>]*/>', '<ds:SignatureMethod/>', bearer))
    write('method-twice', re.sub(r'(<ds:SignatureMethod [^>]*/>)', r'\1\1', bearer))
    write('method-hmac-output-length', re.sub(
        r'<ds:SignatureMethod [^>]*/>', f'<ds:SignatureMethod Algorithm="{MORE}hmac-sha256">'
        '<ds:HMACOutputLength>1</ds:HMACOutputLength></ds:SignatureMethod>', bearer))

    write('digest-sha1', sign(change(template, sha256, DS + 'sha1')))
    for name, uri in (('md5', MORE + 'md5'), ('none', ''), ('unknown', 'urn:unknown')):
        write(f'digest-{name}', change(bearer, sha256, uri))

    for name, uri in (('c14n11', 'http://www.w3.org/2006/12/xml-c14n11'), ('none', ''), ('xslt', 'http://www.w3.org/TR/1999/REC-xslt-19991116')):
        method = f'<ds:CanonicalizationMethod Algorithm="{EXCLUSIVE}"/>'
        write(f'canonicalization-{name}', change(bearer, method, method.replace(EXCLUSIVE, uri)))

    xpath = ('<ds:Transform Algorithm="http://www.w3.org/TR/1999/REC-xpath-19991116">'
             '<ds:XPath>not(ancestor-or-self::*[local-name()="Subject"])</ds:XPath></ds:Transform>')
    # If the service could be made to sign this one, the subject could be anything.
    write('transform-xpath', change(sign(change(template, exclusive, xpath + exclusive)),
                                    'alice@corp.example', 'admin@corp.example'))
    write('transform-xpath-alone', change(bearer, exclusive, xpath))
    write('transform-xslt', change(bearer, exclusive,
          '<ds:Transform Algorithm="http://www.w3.org/TR/1999/REC-xslt-19991116"><xsl:stylesheet version="1.0" '
          'xmlns:xsl="http://www.w3.org/1999/XSL/Transform"><xsl:template match="/"><xsl:value-of '
          'select="document(\'file:///etc/passwd\')"/></xsl:template></xsl:stylesheet></ds:Transform>'))
    for name, uri in (('base64', DS + 'base64'), ('xpath-filter-2', 'http://www.w3.org/2002/06/xmldsig-filter2'),
                      ('decryption', 'http://www.w3.org/2002/07/decrypt#XML'), ('unknown', 'urn:unknown'),
                      ('c14n11', 'http://www.w3.org/2006/12/xml-c14n11')):
        write(f'transform-{name}', change(bearer, exclusive, f'<ds:Transform Algorithm="{uri}"/>'))
    write('transform-three', sign(change(template, exclusive, exclusive + exclusive)))
    write('transform-hundred', change(bearer, exclusive, exclusive * 100))
    write('transform-enveloped-twice', change(bearer, exclusive, enveloped))

    reference = re.search(r'<ds:Reference .*?</ds:Reference>', template, re.S).group()
    write('references-eleven', sign(change(template, reference, reference * 11)))
    write('references-none', re.sub(r'<ds:Reference .*?</ds:Reference>', '', bearer, flags=re.S))
    uri = f'URI="#{ID}"'
    for name, value in (('xpointer-root', '#xpointer(/)'), ('xpointer-id', f"#xpointer(id('{ID}'))"),
                        ('external-http', 'http://127.0.0.1:9/x'), ('external-file', 'file:///etc/passwd'),
                        ('external-relative', f'token.xml#{ID}'), ('other-element', '#_elsewhere'), ('hash-only', '#'),
                        ('prefix-of-id', f'#{ID[:-1]}'), ('longer-than-id', f'#{ID}x'), ('upper-case-id', f'#{ID.upper()}'),
                        ('percent-encoded', f'#%5F{ID[1:]}')):
        write(f'reference-{name}', change(bearer, uri, f'URI="{value}"'))
    write('reference-without-uri', change(bearer, uri, ''))
    # The reference to the assertion is right, but a second one, which must be checked too, is not.
    second = signature[signature.index('<ds:Reference '):signature.index('</ds:SignedInfo>')]
    write('reference-second-unresolvable', change(bearer, '</ds:SignedInfo>', second.replace(f'#{ID}', '#_no') + '</ds:SignedInfo>'))
    write('reference-second-external', change(bearer, '</ds:SignedInfo>', second.replace(f'#{ID}', 'http://127.0.0.1:9/x') + '</ds:SignedInfo>'))

    manifest = (f'<ds:Object><ds:Manifest Id="_manifest">{second}</ds:Manifest></ds:Object>')
    write('manifest', put_signature(unsigned, change(
        signature.replace(uri, f'Type="{DS}Manifest" URI="#_manifest"'), '</ds:Signature>', manifest + '</ds:Signature>')))
    write('object', put_signature(unsigned, into_signature('<x/>')))
    write('object-empty', put_signature(unsigned, into_signature('')))


def signature_values():
    value = re.search(r'<ds:SignatureValue>([^<]*)</ds:SignatureValue>', bearer).group(1)
    raw = base64.b64decode(value)
    digest = re.search(r'<ds:DigestValue>([^<]*)</ds:DigestValue>', bearer).group(1)

    def with_value(octets):
        return change(bearer, value, base64.b64encode(octets).decode())

    write('value-truncated', with_value(raw[:-1]))
    write('value-longer', with_value(raw + b'\0'))
    write('value-leading-zero', with_value(b'\0' + raw))
    write('value-one-octet', with_value(b'\1'))
    write('value-zeros', with_value(bytes(256)))
    write('value-ones', with_value(b'\xff' * 256))
    write('value-reversed', with_value(raw[::-1]))
    write('value-empty', change(bearer, value, ''))
    write('value-not-base64', change(bearer, value, '!' + value[1:]))
    write('value-base64-cut', change(bearer, value, value.rstrip('=')[:-1]))
    write('value-missing', change(bearer, f'<ds:SignatureValue>{value}</ds:SignatureValue>', ''))
    write('value-split-by-comment', change(bearer, value, value[:64] + '<!---->' + value[64:]))
    write('digest-value-empty', change(bearer, digest, ''))
    write('digest-value-truncated', change(bearer, digest, base64.b64encode(base64.b64decode(digest)[:-1]).decode()))
    write('digest-value-longer', change(bearer, digest, base64.b64encode(base64.b64decode(digest) + b'\0').decode()))
    write('digest-value-missing', change(bearer, f'<ds:DigestValue>{digest}</ds:DigestValue>', ''))
    # The value from another token that the same key signed.
    other = re.search(r'<ds:SignatureValue>([^<]*)</ds:SignatureValue>', token('full')).group(1)
    write('value-of-another-token', change(bearer, value, other))
    write('signature-of-another-token', put_signature(unsigned, SIGNATURE.search(token('full')).group()))

    ecdsa = token('ecdsa-p256-sha256').strip()
    ec_value = re.search(r'<ds:SignatureValue>([^<]*)</ds:SignatureValue>', ecdsa).group(1)
    r, s = base64.b64decode(ec_value)[:32], base64.b64decode(ec_value)[32:]

    def integer(octets):
        octets = octets.lstrip(b'\0')
        octets = b'\0' + octets if octets[0] & 0x80 else octets
        return b'\2' + bytes([len(octets)]) + octets

    der = integer(r) + integer(s)
    order = int('ffffffff00000000ffffffffffffffffbce6faada7179e84f3b9cac2fc632551', 16)
    for name, octets in (('zeros', bytes(64)), ('der', b'\x30' + bytes([len(der)]) + der), ('truncated', (r + s)[:-1]),
                         ('longer', r + s + b'\0'), ('swapped', s + r), ('empty', b''),
                         ('order', order.to_bytes(32, 'big') * 2)):
        write(f'ecdsa-value-{name}', change(ecdsa, ec_value, base64.b64encode(octets).decode()))


def resigned_digests():
    """The trusted key signed a wrong digest: only the comparison of the digest can detect it.

    When xmlsec1 signs, it computes the digests itself. So here it only canonicalises SignedInfo, and openssl signs those
    octets with another digest in them.
    """
    with tempfile.TemporaryDirectory() as folder:
        source, octets = os.path.join(folder, 'in.xml'), os.path.join(folder, 'octets')
        with open(source, 'w', encoding='utf-8') as file:
            file.write(blank(bearer))
        log = run('xmlsec1', '--sign', '--store-signatures', '--privkey-pem', f'{key("sts-rsa")}.key,{key("sts-rsa")}.crt',
                  '--id-attr:ID', ASSERTION, '--output', '/dev/null', source).decode()
        signed_info = re.search(r'== PreSigned data - start buffer:\n(.*)\n== PreSigned data - end buffer', log, re.S).group(1)
        digest = re.search(r'<ds:DigestValue>([^<]*)</ds:DigestValue>', bearer).group(1)
        value = re.search(r'<ds:SignatureValue>([^<]*)</ds:SignatureValue>', bearer).group(1)
        raw = base64.b64decode(digest)
        for name, octets_of_digest in (('unchanged', raw), ('one-octet', raw[:1]), ('31-octets', raw[:-1]),
                                       ('one-octet-more', raw + b'\0'), ('32-zeros-more', raw + bytes(32)),
                                       ('first-bit', bytes([raw[0] ^ 0x80]) + raw[1:]),
                                       ('last-bit', raw[:-1] + bytes([raw[-1] ^ 1]))):
            other = base64.b64encode(octets_of_digest).decode()
            with open(octets, 'w', encoding='utf-8') as file:
                file.write(change(signed_info, digest, other))
            other_value = run('openssl', 'dgst', '-sha256', '-sign', key('sts-rsa.key'), octets)
            write(f'digest-resigned-{name}', change(change(bearer, digest, other), value,
                                                    base64.b64encode(other_value).decode()))


def foreign_keys():
    """Signed by the attacker's own key, which the token itself contains for the check."""
    template = blank(change(bearer, 'alice@corp.example', 'admin@corp.example'))
    key_info = re.compile(r'<ds:KeyInfo>.*?</ds:KeyInfo>', re.S)
    write('foreign-certificate', sign(template, 'other'))
    write('foreign-key-value', sign(key_info.sub('<ds:KeyInfo><ds:KeyValue/></ds:KeyInfo>', template), 'other'))
    write('foreign-no-keyinfo', sign(key_info.sub('', template), 'other'))
    trusted = re.search(r'<ds:KeyInfo>.*?</ds:KeyInfo>', signature, re.S).group()
    write('foreign-key-claims-trusted-certificate', key_info.sub(lambda m: trusted, sign(template, 'other')))
    certificate = re.search(r'<ds:X509Certificate>.*?</ds:X509Certificate>', signature, re.S).group()
    write('foreign-key-both-certificates', change(sign(template, 'other'), '<ds:X509Data>', f'<ds:X509Data>{certificate}'))
    write('foreign-retrieval-method', key_info.sub(
        f'<ds:KeyInfo><ds:RetrievalMethod URI="http://127.0.0.1:9/key" Type="{DS}X509Data"/></ds:KeyInfo>', sign(template, 'other')))
    with tempfile.TemporaryDirectory() as folder:
        # A certificate with the same subject as the trusted one.
        path = os.path.join(folder, 'same-name')
        run('openssl', 'req', '-x509', '-newkey', 'rsa:2048', '-nodes', '-subj', '/O=Example/CN=sts', '-days', '36500',
            '-keyout', path + '.key', '-out', path + '.crt')
        write('foreign-certificate-of-same-name', sign(template, '', '--privkey-pem', f'{path}.key,{path}.crt'))
    certificate_text = re.sub(r'</?ds:X509Certificate>', '', certificate)
    write('keyinfo-certificate-does-not-decode', change(bearer, certificate_text, 'AAAA'))
    write('keyinfo-certificate-not-base64', change(bearer, certificate_text, '!!!'))
    write('keyinfo-empty', key_info.sub('<ds:KeyInfo/>', bearer))


def unsigned_tokens():
    write('unsigned', unsigned)
    write('unsigned-empty-signature', put_signature(unsigned, f'<ds:Signature xmlns:ds="{DS}"/>'))
    write('unsigned-signature-in-no-namespace', put_signature(unsigned, '<Signature/>'))
    write('unsigned-signature-is-other-element', put_signature(unsigned, '<saml:Advice/>'))
    write('unsigned-issuer-only', unsigned[:unsigned.index('</saml:Issuer>')] + '</saml:Issuer></saml:Assertion>')
    write('partly-signed-subject', put_signature(change(unsigned, '<saml:Subject>', '<saml:Subject ID="_subject">'),
                                                 signature.replace(f'#{ID}', '#_subject')))
    write('partly-signed-conditions', put_signature(
        change(unsigned, '<saml:Conditions ', '<saml:Conditions Id="_conditions" '), signature.replace(f'#{ID}', '#_conditions')))


def saml2_content():
    """Attacks on what the profile SAML2 ignores or reads in addition."""
    def genuine(name):
        with open(os.path.join(HERE, '..', 'saml2', name + '.xml'), encoding='utf-8') as file:
            return file.read().strip()

    stock = genuine('wss4j-confirmation-data')
    stock_id = re.search(r' ID="([^"]*)"', stock).group(1)
    stock_signature = SIGNATURE.search(stock).group()
    plain = stock.replace(stock_signature, '')
    confirmation = re.search(r'<saml2:SubjectConfirmationData [^>]*/>', plain).group()
    authn = ('<saml2:AuthnStatement AuthnInstant="2020-01-01T00:00:00Z"><saml2:AuthnContext><saml2:AuthnContextDecl>{}'
             '</saml2:AuthnContextDecl></saml2:AuthnContext></saml2:AuthnStatement></saml2:Assertion>')
    end = '</saml2:Assertion>'
    containers = {
        'advice': (end, '<saml2:Advice>{}</saml2:Advice>' + end),
        'foreign-advice': (end, '<saml2:Advice><x>{}</x></saml2:Advice>' + end),
        'confirmation-data': (confirmation, confirmation[:-2] + '>{}</saml2:SubjectConfirmationData>'),
        'unknown-confirmation': ('<saml2:SubjectConfirmation ', '<saml2:SubjectConfirmation Method="urn:x">'
                                 '<saml2:SubjectConfirmationData>{}</saml2:SubjectConfirmationData>'
                                 '</saml2:SubjectConfirmation><saml2:SubjectConfirmation '),
        'attribute-value': (end, '<saml2:AttributeStatement><saml2:Attribute Name="a"><saml2:AttributeValue>{}'
                            '</saml2:AttributeValue></saml2:Attribute></saml2:AttributeStatement>' + end),
        'authn-declaration': (end, authn),
    }

    def inside(text, container, content):
        old, new = containers[container]
        return change(text, old, new.replace('{}', content))

    def with_signature(text, new_signature):
        return change(text, '</saml2:Issuer>', '</saml2:Issuer>' + new_signature)

    for name, evil_id in (('same-id', stock_id), ('other-id', '_forged')):
        evil = change(plain, '>alice<', '>mallory<').replace(stock_id, evil_id)
        for container in containers:
            write(f'saml2-wrap-original-in-{container}-{name}', inside(with_signature(evil, stock_signature), container, plain))
            write(f'saml2-wrap-signed-original-in-{container}-{name}', inside(evil, container, stock))
            write(f'saml2-wrap-twice-signed-original-in-{container}-{name}',
                  inside(with_signature(evil, stock_signature), container, stock))
    for container in containers:
        # The genuine token, with its signature at a place where the profile ignores unknown content.
        write(f'saml2-signature-in-{container}', inside(plain, container, stock_signature))
        # The added content is not signed.
        write(f'saml2-added-{container}', inside(stock, container, '<x/>'))
        # The service signed content from a caller. An element of that content has the identifier of the assertion.
        template = blank(inside(stock, container, f'<x xmlns="urn:x" Id="{stock_id}"/>'))
        write(f'saml2-signed-duplicate-id-in-{container}', sign(template))
        # The service signed content from a caller, and the content is another assertion.
        nested = change(plain, '>alice<', '>mallory<').replace(stock_id, '_nested')
        write(f'saml2-signed-assertion-in-{container}', sign(blank(inside(stock, container, nested))))
        nested_signed = with_signature(nested, stock_signature)
        inner = inside(stock, container, '@NESTED@')
        write(f'saml2-nested-assertion-with-the-signature-in-{container}', change(inner, '@NESTED@', nested_signed))

    # Canonicalisation removes comments, so these are still validly signed.
    for name, file, old, new in (
            ('name', 'name-email', 'alice@corp', 'alice@<!-- -->corp'),
            ('issuer', 'name-email', 'https://idp.', 'https://<!-- -->idp.'),
            ('audience', 'conditions-disjoint-audience-restrictions', '>urn:a<', '>urn<!-- -->:a<'),
            ('delegate', 'delegation', '>last@', '>last<!-- -->@'),
            ('confirming-name', 'delegation-confirmed', 'Confirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer">'
             '<saml2:NameID>last@', 'Confirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"><saml2:NameID>last<!-- -->@'),
            ('attribute', 'wss4j-attributes', '>auditor<', '>aud<!-- -->itor<'),
            ('class', 'wss4j-attributes', 'classes:Password<', 'classes:Pass<!-- -->word<'),
            ('key', 'holder-rsa-value', '<ds:Exponent>AQ', '<ds:Exponent>AQ<!-- -->'),
            ('point', 'holder-ec-value', '<dsig11:PublicKey>BJ', '<dsig11:PublicKey>BJ<!-- -->')):
        write(f'saml2-split-comment-in-{name}', change(genuine(file), old, new))
    attributes = genuine('attributes-all-values')
    write('saml2-comment-in-xml-value', change(attributes, '>inner<', '>in<!-- -->ner<'))

    for name, old, new in (
            ('qualifier-removed', ' NameQualifier="http://sts.partner.example/names"', ''),
            ('qualifier-changed', 'partner.example/names"', 'partner.example/Names"'),
            ('format-removed', ' Format="urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified"', ''),
            ('recipient-removed', ' Recipient="https://files.corp.example/consume"', ''),
            ('request-changed', '"_request-1"', '"_request-2"'),
            ('address-removed', ' Address="192.0.2.7"', ''),
            ('confirmation-lasts-longer', 'NotOnOrAfter="2119', 'NotOnOrAfter="2120'),
            ('method-changed', 'cm:bearer', 'cm:holder-of-key'),
            ('type-removed', ' xsi:type="saml2:AssertionType"', ''),
            ('type-unbound', 'xsi:type="saml2:AssertionType"', 'xsi:type="s:AssertionType"'),
            ('type-without-prefix', 'xsi:type="saml2:AssertionType"', 'xsi:type="AssertionType"'),
            ('type-of-another-namespace', 'xsi:type="saml2:AssertionType"', 'xmlns:s="urn:x" xsi:type="s:AssertionType"'),
            ('confirmation-added', '<saml2:SubjectConfirmation ', '<saml2:SubjectConfirmation Method='
             '"urn:oasis:names:tc:SAML:2.0:cm:bearer"/><saml2:SubjectConfirmation ')):
        write(f'saml2-{name}', change(stock, old, new))
    conditions = genuine('wss4j-conditions')
    write('saml2-audience-restriction-removed', re.sub(r'<saml2:AudienceRestriction>.*?</saml2:AudienceRestriction>', '',
                                                       conditions, count=1, flags=re.S))
    write('saml2-one-time-use-removed', change(conditions, '<saml2:OneTimeUse/>', ''))
    session = genuine('authn-everything')
    write('saml2-session-extended', change(session, 'SessionNotOnOrAfter="2119', 'SessionNotOnOrAfter="2120'))
    # With exclusive canonicalisation, the declaration of a prefix is not signed if only the value of xsi:type uses it.
    delegated = genuine('delegation')
    prefix = re.search(r'xsi:type="([^":]*):DelegationRestrictionType"', delegated).group(1)
    write('saml2-delegation-type-rebound', change(
        delegated, f'xsi:type="{prefix}:DelegationRestrictionType"', f'xmlns:e="urn:evil" xsi:type="e:DelegationRestrictionType"'))
    holder = genuine('holder-certificate-and-value')
    other = re.sub(r'-----[^-]*-----', '', open(key('other.crt'), encoding='ascii').read())
    write('saml2-holder-certificate-changed', re.sub(
        r'(<saml2:SubjectConfirmationData.*<ds:X509Certificate>)[^<]*', lambda m: m.group(1) + other, holder, flags=re.S))
    write('saml2-holder-value-changed', re.sub(
        r'(<saml2:SubjectConfirmationData.*<ds:Modulus>)....', lambda m: m.group(1) + 'AAAA', holder, flags=re.S))
    write('saml2-holder-value-only', re.sub(
        r'(<saml2:SubjectConfirmationData.*)<ds:X509Data>.*?</ds:X509Data>', lambda m: m.group(1), holder, flags=re.S))
    # The service signed these, and none of them is the method that it looks like.
    for name, method in (('blank-before', ' urn:oasis:names:tc:SAML:2.0:cm:bearer'), ('blank-after', 'urn:oasis:names:tc:SAML:2.0:cm:bearer '),
                         ('no-break-blank', '&#xA0;urn:oasis:names:tc:SAML:2.0:cm:bearer'), ('upper-case', 'URN:OASIS:names:tc:SAML:2.0:cm:bearer'),
                         ('longer', 'urn:oasis:names:tc:SAML:2.0:cm:bearer#'), ('percent', 'urn:oasis:names:tc:SAML:2.0:cm:beare%72'),
                         ('older', 'urn:oasis:names:tc:SAML:1.0:cm:bearer'), ('empty', '')):
        write(f'saml2-method-{name}', sign(blank(change(stock, 'urn:oasis:names:tc:SAML:2.0:cm:bearer', method))))


def documents():
    with open(os.path.join(HERE, 'not-utf-8.xml'), 'wb') as file:
        file.write(bearer.replace('alice@', '\udcff@').encode('utf-8', 'surrogateescape'))
    write('empty', '')
    write('blank', ' \n')
    write('not-xml', 'hello\n')
    write('html', '<html><body>Service unavailable</body></html>')
    write('other-root', '<envelope/>')
    write('two-roots', bearer + bearer)
    write('text-after-root', bearer + 'x')
    write('nul-after-root', bearer + '\0')
    write('soap-fault', '<s:Envelope xmlns:s="http://schemas.xmlsoap.org/soap/envelope/"><s:Body><s:Fault/></s:Body></s:Envelope>')


GROUPS = (wrapping, duplicate_ids, entities, splitting, namespaces, algorithms, signature_values, resigned_digests,
          foreign_keys, unsigned_tokens, saml2_content, documents)
for group in GROUPS:
    if len(sys.argv) == 1 or group.__name__ in sys.argv[1:]:
        group()
