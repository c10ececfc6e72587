#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes saml2.xml and in-envelope.xml of this folder from templates/, with xmlsec1 (1.2.37 or later) and the keys of ../tokens:
# a signed assertion in a form that the SAML 2.0 core specification allows and this library does not accept, alone and in the
# header of a SOAP message. saml-1.1.xml is written by hand.
set -euo pipefail
cd "$(dirname "$0")"

ASSERTION=urn:oasis:names:tc:SAML:2.0:assertion:Assertion
work=$(mktemp -d)
trap 'rm -r "$work"' EXIT

template=$(<templates/saml2.xml.in)
signature=$(<templates/signature.xml.in)
id=$(sed -nE 's/.* ID="([^"]+)".*/\1/p' templates/saml2.xml.in)
printf '%s\n' "${template/@SIGNATURE@/${signature/@ID@/$id}}" >"$work/template.xml"
xmlsec1 --sign --privkey-pem ../tokens/sts-rsa.key,../tokens/sts-rsa.crt --id-attr:ID "$ASSERTION" \
  --output "$work/signed.xml" "$work/template.xml"
sed '/^<?xml /d' "$work/signed.xml" >saml2.xml

{
  printf '%s' '<soap:Envelope xmlns:soap="http://schemas.xmlsoap.org/soap/envelope/"><soap:Header>' \
    '<wsse:Security xmlns:wsse="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd">'
  tr -d '\n' <saml2.xml
  printf '%s\n' '</wsse:Security></soap:Header><soap:Body/></soap:Envelope>'
} >"$work/envelope.xml"
mv "$work/envelope.xml" in-envelope.xml

# It also complains that nobody issued the certificate in the KeyInfo, and then uses the given one.
for name in saml2 in-envelope; do
  xmlsec1 --verify --pubkey-cert-pem ../tokens/sts-rsa.crt --id-attr:ID "$ASSERTION" "$name.xml" 2>"$work/log" ||
    { cat "$work/log" >&2; exit 1; }
done
