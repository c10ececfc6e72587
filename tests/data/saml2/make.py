#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
"""Makes the assertions of this folder that are not in details.txt: text changes to one assertion, signed with xmlsec1.

The names of those that must be refused begin with "refused-", the others with "form-". The outcome of each is in expected.tsv.
"""
import os
import re
import subprocess
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
TOKENS = os.path.join(HERE, '..', 'tokens')
ASSERTION = 'urn:oasis:names:tc:SAML:2.0:assertion:Assertion'
XSI = 'xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance"'
XS = 'xmlns:xs="http://www.w3.org/2001/XMLSchema"'
DELEGATION = 'xmlns:del="urn:oasis:names:tc:SAML:2.0:conditions:delegation"'
RSA = 'xmlns:rsa="http://www.rsa.com/names/2009/12/std-ext/SAML2.0"'
BEARER = '<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"/>'
HOLDER = '<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:holder-of-key">%s</saml:SubjectConfirmation>'
NAME = '<saml:NameID>alice</saml:NameID>'
AUTHN = ('<saml:AuthnStatement AuthnInstant="2020-01-01T00:00:00Z"><saml:AuthnContext><saml:AuthnContextClassRef>'
         'urn:oasis:names:tc:SAML:2.0:ac:classes:Password</saml:AuthnContextClassRef></saml:AuthnContext>'
         '</saml:AuthnStatement>')
ATTRIBUTES = ('<saml:AttributeStatement><saml:Attribute Name="role"><saml:AttributeValue>auditor</saml:AttributeValue>'
              '</saml:Attribute></saml:AttributeStatement>')
CONDITIONS = '</saml:Conditions>'
GROUPS = 'http://www.rsa.com/schemas/attr-names/2009/01/GroupIdentity'
SOLUTION = 'http://www.rsa.com/schemas/attr-names/2011/07/isSolution'
ENCRYPTED = ('<xenc:EncryptedData xmlns:xenc="http://www.w3.org/2001/04/xmlenc#"><xenc:CipherData><xenc:CipherValue>AAAA'
             '</xenc:CipherValue></xenc:CipherData></xenc:EncryptedData>')
BASE = ('<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion" ID="@ID@" IssueInstant="2020-01-01T00:00:00Z" '
        'Version="2.0"><saml:Issuer>https://idp.partner.example/sts</saml:Issuer>@SIGNATURE@<saml:Subject>' + NAME + BEARER +
        '</saml:Subject><saml:Conditions NotBefore="2020-01-01T00:00:00Z" NotOnOrAfter="2120-01-01T00:00:00Z">'
        '</saml:Conditions>' + AUTHN + ATTRIBUTES + '</saml:Assertion>')
SIGNATURE = ('<ds:Signature xmlns:ds="http://www.w3.org/2000/09/xmldsig#"><ds:SignedInfo>'
             '<ds:CanonicalizationMethod Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/>'
             '<ds:SignatureMethod Algorithm="http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"/>'
             '<ds:Reference URI="#@ID@"><ds:Transforms>'
             '<ds:Transform Algorithm="http://www.w3.org/2000/09/xmldsig#enveloped-signature"/>'
             '<ds:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/></ds:Transforms>'
             '<ds:DigestMethod Algorithm="http://www.w3.org/2001/04/xmlenc#sha256"/><ds:DigestValue/></ds:Reference>'
             '</ds:SignedInfo><ds:SignatureValue/></ds:Signature>')


def certificate(name):
    with open(os.path.join(TOKENS, name + '.crt'), encoding='ascii') as file:
        return file.read().replace('-----BEGIN CERTIFICATE-----', '').replace('-----END CERTIFICATE-----', '')


def rsa_value(name):
    """The RSAKeyValue of a certificate's key."""
    text = subprocess.run(['openssl', 'x509', '-in', os.path.join(TOKENS, name + '.crt'), '-noout', '-modulus'],
                          check=True, capture_output=True, text=True).stdout
    modulus = bytes.fromhex(text.strip().split('=')[1])
    import base64
    return ('<ds:KeyValue><ds:RSAKeyValue><ds:Modulus>' + base64.b64encode(modulus).decode() +
            '</ds:Modulus><ds:Exponent>AQAB</ds:Exponent></ds:RSAKeyValue></ds:KeyValue>')


def key_info(content):
    return HOLDER % ('<saml:SubjectConfirmationData><ds:KeyInfo xmlns:ds="http://www.w3.org/2000/09/xmldsig#">' + content +
                     '</ds:KeyInfo></saml:SubjectConfirmationData>')


def x509(*names):
    return '<ds:X509Data>' + ''.join(
        f'<ds:X509Certificate>{certificate(name)}</ds:X509Certificate>' for name in names) + '</ds:X509Data>'


def data(attributes, content=''):
    return BEARER.replace('/>', f'><saml:SubjectConfirmationData {attributes}>{content}'
                          '</saml:SubjectConfirmationData></saml:SubjectConfirmation>')


def token(name, *changes):
    """Writes NAME.xml: the assertion with `changes`, which are pairs of an old and a new text, and then signed."""
    text = BASE
    for old, new in changes:
        assert old in text, (name, old)
        text = text.replace(old, new, 1)
    text = text.replace('@SIGNATURE@', SIGNATURE).replace('@ID@', '_' + name)
    with tempfile.TemporaryDirectory() as folder:
        source = os.path.join(folder, 'in.xml')
        with open(source, 'w', encoding='utf-8') as file:
            file.write(text)
        signed = subprocess.run(
            ['xmlsec1', '--sign', '--privkey-pem', os.path.join(TOKENS, 'sts-rsa.key'), '--id-attr:ID', ASSERTION, source],
            check=True, capture_output=True).stdout.decode()
    with open(os.path.join(HERE, name + '.xml'), 'w', encoding='utf-8') as file:
        file.write(re.sub(r'^<\?xml[^>]*\?>\n', '', signed))


def condition(text):
    return (CONDITIONS, text + CONDITIONS)


def attribute(text):
    return ('<saml:Attribute Name="role"><saml:AttributeValue>auditor</saml:AttributeValue></saml:Attribute>', text)


def forms():
    """Tokens that must be accepted."""
    token('form-no-attribute-statement', (ATTRIBUTES, ''))
    token('form-no-statement', (AUTHN + ATTRIBUTES, ''))
    token('form-many-statements', (AUTHN + ATTRIBUTES, ATTRIBUTES + AUTHN + ATTRIBUTES + AUTHN))
    token('form-white-space', ('<saml:Subject>', '\n  <saml:Subject>\n    '), (NAME, NAME + '\n    '),
          (BEARER, BEARER + '\n'), condition('\n  '), (AUTHN, '\n  ' + AUTHN + '\n\t'))
    token('form-comments', ('<saml:Subject>', '<!-- a --><saml:Subject><!-- b -->'), (BEARER, BEARER + '<!-- c -->'),
          condition('<!-- d -->'), (ATTRIBUTES, '<!-- e -->' + ATTRIBUTES))
    token('form-types-of-the-schema', ('<saml:Assertion', f'<saml:Assertion {XSI} xsi:type="saml:AssertionType"'),
          ('<saml:Issuer', '<saml:Issuer xsi:type="saml:NameIDType"'), ('<saml:NameID', '<saml:NameID xsi:type="saml:NameIDType"'))
    token('form-type-by-another-prefix',
          ('<saml:Assertion', f'<saml:Assertion {XSI} xmlns:other="urn:oasis:names:tc:SAML:2.0:assertion" '
           'xsi:type="other:AssertionType"'))
    token('form-certificate-with-line-breaks', (BEARER, key_info(x509('holder'))))
    token('form-key-name-and-certificate', (BEARER, key_info('<ds:KeyName>holder</ds:KeyName>' + x509('holder'))))
    token('form-certificate-and-equal-key', (BEARER, key_info(rsa_value('holder') + x509('holder'))))
    token('form-two-audiences-restrictions-and-others', condition(
        '<saml:OneTimeUse/><saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>'
        '<saml:ProxyRestriction Count="1"/><saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience>'
        '<saml:Audience>urn:b</saml:Audience></saml:AudienceRestriction>'))
    token('form-renew-restriction', condition(f'<saml:Condition {XSI} {RSA} xsi:type="rsa:RenewRestrictionType" Count="3"/>'))
    token('form-confirmation-without-known-method',
          (BEARER, '<saml:SubjectConfirmation Method="urn:example:m"/>' + BEARER))
    token('form-confirmation-with-content', (BEARER, data('Recipient="urn:r"', '<x xmlns="urn:x" ID="_y">text</x>text')))
    token('form-unusable-key-and-bearer', (BEARER, key_info('<ds:KeyName>k</ds:KeyName>') + BEARER))
    token('form-attribute-values', attribute(
        f'<saml:Attribute Name="role" x:a="1" xmlns:x="urn:x"><saml:AttributeValue {XSI} {XS} xsi:type="xs:anyType"><a>1</a>'
        f'<!-- c --><b/></saml:AttributeValue><saml:AttributeValue {XSI} xsi:nil="1"/><saml:AttributeValue y="1">'
        '</saml:AttributeValue></saml:Attribute><saml:Attribute Name=""/>'))
    token('form-group-without-domain', attribute(
        f'<saml:Attribute Name="{GROUPS}"><saml:AttributeValue>users</saml:AttributeValue></saml:Attribute>'))


def refused():
    """Tokens that must be refused, each with a message that states the reason."""
    token('refused-encrypted-id', (NAME, f'<saml:EncryptedID>{ENCRYPTED}</saml:EncryptedID>'))
    token('refused-base-id', (NAME, f'<saml:BaseID {XSI} xmlns:x="urn:x" xsi:type="x:T"/>'))
    token('refused-encrypted-attribute', attribute(f'<saml:EncryptedAttribute>{ENCRYPTED}</saml:EncryptedAttribute>'))
    token('refused-authz-decision', (AUTHN, '<saml:AuthzDecisionStatement Resource="urn:r" Decision="Permit"><saml:Action '
                                     'Namespace="urn:n">read</saml:Action></saml:AuthzDecisionStatement>'))
    token('refused-unknown-statement', (AUTHN, f'<saml:Statement {XSI} xmlns:x="urn:x" xsi:type="x:T"/>'))
    token('refused-foreign-statement', (AUTHN, '<x xmlns="urn:x"/>'))
    token('refused-no-subject', (f'<saml:Subject>{NAME}{BEARER}</saml:Subject>', ''))
    token('refused-no-name-id', (NAME, ''))
    token('refused-no-confirmation', (BEARER, ''))
    token('refused-unknown-methods', (BEARER, '<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:sender-vouches"/>'
                                      '<saml:SubjectConfirmation Method="urn:example:m"/>'))
    token('refused-confirmation-expired', (BEARER, data('NotOnOrAfter="2021-01-01T00:00:00Z"')))
    token('refused-confirmation-early', (BEARER, data('NotBefore="2110-01-01T00:00:00Z"')))
    token('refused-confirmation-times-crossed',
          (BEARER, data('NotBefore="2022-01-01T00:00:00Z" NotOnOrAfter="2021-01-01T00:00:00Z"')))
    token('refused-holder-without-data', (BEARER, HOLDER % ''))
    token('refused-holder-key-name-only', (BEARER, key_info('<ds:KeyName>k</ds:KeyName>')))
    token('refused-holder-key-differs-from-certificate', (BEARER, key_info(x509('holder') + rsa_value('other'))))
    token('refused-session-ended', ('AuthnInstant=', 'SessionNotOnOrAfter="2021-01-01T00:00:00Z" AuthnInstant='))
    token('refused-second-session-ended', (AUTHN, AUTHN + AUTHN.replace(
        'AuthnInstant=', 'SessionNotOnOrAfter="2021-01-01T00:00:00Z" AuthnInstant=')))
    token('refused-expired', ('NotOnOrAfter="2120', 'NotOnOrAfter="2021'))
    token('refused-early', ('NotBefore="2020', 'NotBefore="2110'))
    token('refused-no-end', (' NotOnOrAfter="2120-01-01T00:00:00Z"', ''))
    token('refused-no-conditions', ('<saml:Conditions NotBefore="2020-01-01T00:00:00Z" NotOnOrAfter="2120-01-01T00:00:00Z">'
                                    '</saml:Conditions>', ''))
    token('refused-issued-in-the-future-without-not-before', (' NotBefore="2020-01-01T00:00:00Z"', ''),
          ('IssueInstant="2020', 'IssueInstant="2110'))
    token('refused-unknown-condition', condition(f'<saml:Condition {XSI} xmlns:x="urn:x" xsi:type="x:T"/>'))
    token('refused-condition-without-type', condition('<saml:Condition/>'))
    token('refused-foreign-condition', condition('<x xmlns="urn:x"/>'))
    token('refused-two-one-time-use', condition('<saml:OneTimeUse/><saml:OneTimeUse/>'))
    token('refused-two-proxy-restrictions', condition('<saml:ProxyRestriction/><saml:ProxyRestriction/>'))
    token('refused-proxy-count', condition('<saml:ProxyRestriction Count="-1"/>'))
    token('refused-empty-audience-restriction', condition('<saml:AudienceRestriction/>'))
    token('refused-assertion-type', ('<saml:Assertion', f'<saml:Assertion {XSI} xmlns:x="urn:x" xsi:type="x:T"'))
    token('refused-assertion-type-unbound', ('<saml:Assertion', f'<saml:Assertion {XSI} xsi:type="x:AssertionType"'))
    token('refused-assertion-type-without-prefix', ('<saml:Assertion', f'<saml:Assertion {XSI} xsi:type="AssertionType"'))
    token('refused-name-id-type', ('<saml:NameID', f'<saml:NameID {XSI} xmlns:x="urn:x" xsi:type="x:T"'))
    token('refused-assertion-attribute', ('<saml:Assertion', '<saml:Assertion Consent="yes"'))
    token('refused-empty-format', ('<saml:NameID', '<saml:NameID Format=""'))
    token('refused-blank-qualifier', ('<saml:NameID', '<saml:NameID NameQualifier=" "'))
    token('refused-blank-sp-qualifier', ('<saml:NameID', '<saml:NameID SPNameQualifier="&#9;"'))
    token('refused-empty-name', (NAME, '<saml:NameID></saml:NameID>'))
    token('refused-name-with-element', (NAME, '<saml:NameID>alice<x/></saml:NameID>'))
    token('refused-name-with-comment', (NAME, '<saml:NameID>alice<!-- -->.admin</saml:NameID>'))
    token('refused-delegate-without-restriction', (BEARER, BEARER.replace('/>', '><saml:NameID>bob</saml:NameID>'
                                                                          '</saml:SubjectConfirmation>')))
    token('refused-confirmation-of-another-delegate',
          (BEARER, BEARER.replace('/>', '><saml:NameID>bob</saml:NameID></saml:SubjectConfirmation>')),
          condition(f'<saml:Condition {XSI} {DELEGATION} xsi:type="del:DelegationRestrictionType"><del:Delegate '
                    'DelegationInstant="2020-01-01T00:00:00Z"><saml:NameID>carol</saml:NameID></del:Delegate></saml:Condition>'))
    token('refused-version', ('Version="2.0"', 'Version="2.1"'))
    token('refused-group-of-xml', attribute(
        f'<saml:Attribute Name="{GROUPS}"><saml:AttributeValue><a/></saml:AttributeValue></saml:Attribute>'))
    token('refused-solution-twice', attribute(
        f'<saml:Attribute Name="{SOLUTION}"><saml:AttributeValue>true</saml:AttributeValue><saml:AttributeValue>true'
        '</saml:AttributeValue></saml:Attribute>'))
    token('refused-attribute-without-name', attribute('<saml:Attribute/>'))
    token('refused-advice-before-conditions', ('<saml:Conditions', '<saml:Advice/><saml:Conditions'))
    token('refused-two-subjects', (f'<saml:Subject>{NAME}{BEARER}</saml:Subject>',
                                   f'<saml:Subject>{NAME}{BEARER}</saml:Subject>' * 2))


if __name__ == '__main__':
    forms()
    refused()
