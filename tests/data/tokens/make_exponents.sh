#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes certificates with unusable RSA exponents, with openssl (3.0 or later), from the modulus of sts-rsa.crt: openssl makes
# no such keys, so this script composes their encoding. Also makes a signature value that anyone can compute: with the
# exponent 1, each value is its own power, so the padded digest is its own signature.
set -euo pipefail
cd "$(dirname "$0")"
work=$(mktemp -d)
trap 'rm -r "$work"' EXIT

# certificate EXPONENT: sts-rsa-eEXPONENT.crt, issued by sts-rsa.
certificate() {
  cat >"$work/key.cnf" <<END
asn1 = SEQUENCE:subject_public_key_info
[subject_public_key_info]
algorithm = SEQUENCE:algorithm
key = BITWRAP,SEQUENCE:rsa
[algorithm]
algorithm = OID:rsaEncryption
parameters = NULL
[rsa]
n = INTEGER:0x$(openssl x509 -in sts-rsa.crt -noout -modulus | sed 's/Modulus=//')
e = INTEGER:$1
END
  openssl asn1parse -genconf "$work/key.cnf" -noout -out "$work/key.der"
  openssl pkey -pubin -inform DER -in "$work/key.der" -out "$work/key.pem"
  openssl x509 -new -subj "/CN=exponent $1" -days 36500 -force_pubkey "$work/key.pem" \
    -CA sts-rsa.crt -CAkey sts-rsa.key -out "sts-rsa-e$1.crt"
}

for exponent in 1 2 3; do
  [ -f "sts-rsa-e$exponent.crt" ] || certificate "$exponent"
done

# The padded digest of SignedInfo in rsa-sha256.xml, recovered from its signature with the genuine key.
sed -n 's/.*<ds:SignatureValue>//; T; :more; /SignatureValue>/!{N; b more}; s/<\/ds:SignatureValue>.*//; s/[[:space:]]//g; p; q' \
  rsa-sha256.xml | base64 -d >"$work/value"
openssl pkeyutl -verifyrecover -certin -inkey sts-rsa.crt -pkeyopt rsa_padding_mode:none -in "$work/value" |
  base64 -w 0 >sts-rsa-e1.forged-value
