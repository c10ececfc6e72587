#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Verifies the signatures of this folder with openssl. They are test cases of RFC 9421, appendix B: NAME.base is the signature
# base, NAME.sig the octets of the signature.
set -euo pipefail
cd "$(dirname "$0")"

# number FILE OFFSET: prints the integer of 32 octets at OFFSET in hexadecimal.
number() {
  xxd -p -c 32 -s "$2" -l 32 "$1"
}

openssl dgst -sha512 -verify rsa-pss.pub.pem -sigopt rsa_padding_mode:pss -sigopt rsa_pss_saltlen:64 -signature b23.sig \
  b23.base
openssl pkeyutl -verify -pubin -inkey ed25519.pub.pem -rawin -in b26.base -sigfile b26.sig
openssl asn1parse -noout -genconf <(printf 'asn1=SEQUENCE:pair\n[pair]\nr=INTEGER:0x%s\ns=INTEGER:0x%s\n' \
  "$(number b24.sig 0)" "$(number b24.sig 32)") -out b24.der
openssl dgst -sha256 -verify ecc-p256.pub.pem -signature b24.der b24.base
rm b24.der
