#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes the key, certificate and signature fixtures of this folder, with openssl (3.0 or later). Existing files are kept,
# because other fixtures depend on them; to make all again, delete all except this file. Every passphrase is "open sesame".
set -euo pipefail
cd "$(dirname "$0")"

PASSPHRASE=pass:open\ sesame

# missing FILE: whether FILE does not exist yet; if so, prints that it is being made.
missing() {
  [ ! -f "$1" ] || return 1
  echo "making $1"
}

# certificate NAME SUBJECT: makes a self-signed certificate, valid from 2020 to 2120, for NAME.key. With `openssl ca`, because
# `openssl req` accepts no dates before OpenSSL 3.4.
certificate() {
  local name=$1 subject=$2 ca
  missing "$name.crt" || return 0
  ca=$(mktemp -d)
  touch "$ca/index"
  cat >"$ca/ca.cnf" <<END
[ca]
default_ca = here
[here]
database = $ca/index
new_certs_dir = $ca
serial = $ca/serial
default_md = default
policy = names
[names]
O = supplied
CN = supplied
END
  openssl req -new -utf8 -key "$name.key" -subj "$subject" -out "$ca/request"
  openssl ca -utf8 -config "$ca/ca.cnf" -batch -notext -create_serial -selfsign -keyfile "$name.key" -in "$ca/request" \
    -startdate 20200102030405Z -enddate 21200102030405Z -out "$name.crt" 2>/dev/null
  rm -r "$ca"
}

# identity NAME KEY_OPTIONS...: makes a key with its certificate.
identity() {
  local name=$1
  shift
  ! missing "$name.key" || openssl genpkey -quiet "$@" -out "$name.key"
  certificate "$name" "/O=Example/CN=$name"
}

identity rsa1024 -algorithm RSA -pkeyopt rsa_keygen_bits:1024
identity rsa2048 -algorithm RSA -pkeyopt rsa_keygen_bits:2048
identity rsa3072 -algorithm RSA -pkeyopt rsa_keygen_bits:3072
identity p256 -algorithm EC -pkeyopt ec_paramgen_curve:P-256
identity p384 -algorithm EC -pkeyopt ec_paramgen_curve:P-384
identity p521 -algorithm EC -pkeyopt ec_paramgen_curve:P-521
identity p224 -algorithm EC -pkeyopt ec_paramgen_curve:P-224
identity ed25519 -algorithm ED25519

# Names that need UTF-8 and escapes.
[ -f names.key ] || cp rsa2048.key names.key
certificate names '/O=Exämple, Inc./CN=Zoë \+ "Ω"'

# Certificates in other formats.
for name in rsa2048 p256; do
  ! missing "$name.crt.der" || openssl x509 -in "$name.crt" -outform DER -out "$name.crt.der"
done
! missing rsa2048.sha256 || printf %s "$(openssl dgst -sha256 -r rsa2048.crt.der | cut -d' ' -f1)" >rsa2048.sha256
! missing bundle.pem || { echo "A comment before the first block"; cat rsa2048.crt p256.crt rsa3072.crt; } >bundle.pem
! missing bundle-with-key.pem || cat rsa2048.crt rsa2048.key p256.crt >bundle-with-key.pem

# Private keys in every format.
for name in rsa2048 p256; do
  ! missing "$name.key.der" || openssl pkey -in "$name.key" -outform DER -out "$name.key.der"
  ! missing "$name-traditional.key" || openssl pkey -in "$name.key" -traditional -out "$name-traditional.key"
  ! missing "$name-traditional-encrypted.key" ||
    openssl pkey -in "$name.key" -traditional -aes256 -passout "$PASSPHRASE" -out "$name-traditional-encrypted.key"
  ! missing "$name-encrypted.key" ||
    openssl pkcs8 -topk8 -in "$name.key" -v2 aes-256-cbc -passout "$PASSPHRASE" -out "$name-encrypted.key"
  ! missing "$name-encrypted.key.der" ||
    openssl pkcs8 -topk8 -in "$name.key" -v2 aes-256-cbc -passout "$PASSPHRASE" -outform DER -out "$name-encrypted.key.der"
done
! missing rsa2048-traditional.key.der ||
  openssl rsa -in rsa2048.key -traditional -outform DER -out rsa2048-traditional.key.der
! missing p256-traditional.key.der || openssl ec -in p256.key -outform DER -out p256-traditional.key.der
! missing rsa2048-scrypt.key || openssl pkcs8 -topk8 -in rsa2048.key -scrypt -passout "$PASSPHRASE" -out rsa2048-scrypt.key
# A cipher that OpenSSL 3 offers only through its legacy provider.
! missing rsa2048-des.key || openssl pkcs8 -topk8 -in rsa2048.key -v1 PBE-MD5-DES -provider legacy -provider default \
  -passout "$PASSPHRASE" -out rsa2048-des.key
! missing certificate-then-key.pem || cat rsa2048.crt rsa2048.key >certificate-then-key.pem

# PKCS#12.
! missing rsa2048.p12 || openssl pkcs12 -export -inkey rsa2048.key -in rsa2048.crt -certfile p256.crt \
  -passout "$PASSPHRASE" -out rsa2048.p12
! missing p256.p12 || openssl pkcs12 -export -inkey p256.key -in p256.crt -passout "$PASSPHRASE" -out p256.p12
! missing rsa2048-no-passphrase.p12 || openssl pkcs12 -export -inkey rsa2048.key -in rsa2048.crt -keypbe NONE \
  -certpbe NONE -passout pass: -out rsa2048-no-passphrase.p12
! missing certificate-only.p12 || openssl pkcs12 -export -nokeys -in rsa2048.crt -passout "$PASSPHRASE" \
  -out certificate-only.p12
! missing key-only.p12 || openssl pkcs12 -export -nocerts -inkey rsa2048.key -passout "$PASSPHRASE" -out key-only.p12

# Public keys (SubjectPublicKeyInfo).
for name in rsa1024 rsa2048 p224 p256 p384 p521 ed25519; do
  ! missing "$name.spki.der" || openssl pkey -in "$name.key" -pubout -outform DER -out "$name.spki.der"
done
! missing p256-compressed.spki.der ||
  openssl ec -in p256.key -pubout -conv_form compressed -outform DER -out p256-compressed.spki.der

# Signatures over message.txt: NAME-SCHEME-DIGEST.sig. ECDSA values also as r followed by s, NAME-ecdsa-DIGEST.raw.
! missing message.txt || printf 'What is signed is what was meant.\n' >message.txt

# number DER INDEX BYTES: prints integer number INDEX of the DER sequence as BYTES bytes in hexadecimal.
number() {
  local hex
  hex=$(openssl asn1parse -inform DER -in "$1" | sed -n 's/.*INTEGER *://p' | sed -n "$2p")
  printf "%$(($3 * 2))s" "$hex" | tr ' ' 0
}

# ecdsa NAME BYTES: makes signatures with NAME.key, whose curve's order has BYTES bytes.
ecdsa() {
  local name=$1 bytes=$2 digest hex
  for digest in sha256 sha384 sha512; do
    missing "$name-ecdsa-$digest.sig" || continue
    openssl dgst "-$digest" -sign "$name.key" -out "$name-ecdsa-$digest.sig" message.txt
    hex=$(number "$name-ecdsa-$digest.sig" 1 "$bytes")$(number "$name-ecdsa-$digest.sig" 2 "$bytes")
    # shellcheck disable=SC2001
    printf '%b' "$(sed 's/../\\x&/g' <<<"$hex")" >"$name-ecdsa-$digest.raw"
  done
}

for digest in sha256 sha384 sha512; do
  for name in rsa2048 rsa3072; do
    ! missing "$name-pkcs1-$digest.sig" ||
      openssl dgst "-$digest" -sign "$name.key" -out "$name-pkcs1-$digest.sig" message.txt
    ! missing "$name-pss-$digest.sig" || openssl dgst "-$digest" -sign "$name.key" -sigopt rsa_padding_mode:pss \
      -sigopt rsa_pss_saltlen:digest -out "$name-pss-$digest.sig" message.txt
  done
done
! missing rsa2048-pss-salt20-sha256.sig || openssl dgst -sha256 -sign rsa2048.key -sigopt rsa_padding_mode:pss \
  -sigopt rsa_pss_saltlen:20 -out rsa2048-pss-salt20-sha256.sig message.txt
! missing rsa2048-pss-mgf1-sha1-sha256.sig || openssl dgst -sha256 -sign rsa2048.key -sigopt rsa_padding_mode:pss \
  -sigopt rsa_pss_saltlen:digest -sigopt rsa_mgf1_md:sha1 -out rsa2048-pss-mgf1-sha1-sha256.sig message.txt
ecdsa p256 32
ecdsa p384 48
ecdsa p521 66
