#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes the keys and certificates of this folder with openssl (3.0 or later). Existing files are kept; to make all again,
# delete all except this file.
set -euo pipefail
cd "$(dirname "$0")"

work=$(mktemp -d)
trap 'rm -r "$work"' EXIT
touch "$work/index"
cat >"$work/ca.cnf" <<END
[ca]
default_ca = here
[here]
database = $work/index
new_certs_dir = $work
serial = $work/serial
default_md = sha256
policy = names
unique_subject = no
[names]
CN = supplied
END

# certificate NAME ISSUER EXTENSIONS [START END]: makes NAME.key and NAME.crt with the subject CN=NAME, signed by ISSUER's key
# (by its own key when ISSUER is NAME), valid from 2020 to 2120 by default. With `openssl ca`, because `openssl x509` accepts
# no dates before OpenSSL 3.4. An existing NAME.key is kept.
certificate() {
  local name=$1 issuer=$2 extensions=$3 start=${4:-20200102030405Z} end=${5:-21200102030405Z} signer
  [ ! -f "$name.crt" ] || return 0
  echo "making $name"
  [ -f "$name.key" ] || openssl genpkey -algorithm EC -pkeyopt ec_paramgen_curve:P-256 -out "$name.key"
  openssl req -new -key "$name.key" -subj "/CN=$name" -out "$work/request"
  printf '%b\n' "$extensions" >"$work/extensions"
  signer=(-keyfile "$issuer.key" -cert "$issuer.crt")
  [ "$issuer" != "$name" ] || signer=(-selfsign -keyfile "$name.key")
  openssl ca -config "$work/ca.cnf" -batch -notext -rand_serial "${signer[@]}" -in "$work/request" \
    -extfile "$work/extensions" -startdate "$start" -enddate "$end" -out "$name.crt" 2>/dev/null
}

authority='basicConstraints=critical,CA:TRUE\nkeyUsage=critical,keyCertSign,cRLSign\nsubjectKeyIdentifier=hash'
here='subjectAltName=DNS:localhost,IP:127.0.0.1,IP:::1'
server='extendedKeyUsage=serverAuth\nbasicConstraints=CA:FALSE'

certificate authority authority "$authority"
certificate unknown-authority unknown-authority "$authority"
certificate intermediate authority "$authority"

certificate localhost authority "$server\n$here"
for bits in 1024 2048; do
  [ -f "localhost-rsa$bits.key" ] || openssl genpkey -quiet -algorithm RSA -pkeyopt "rsa_keygen_bits:$bits" \
    -out "localhost-rsa$bits.key"
  certificate "localhost-rsa$bits" authority "$server\n$here"
done
certificate other-host authority "$server\nsubjectAltName=DNS:other.example"
certificate expired authority "$server\n$here" 20200102030405Z 20210102030405Z
certificate not-yet-valid authority "$server\n$here" 21100102030405Z 21200102030405Z
certificate untrusted unknown-authority "$server\n$here"
certificate self-signed self-signed "$server\n$here"
certificate client intermediate 'extendedKeyUsage=clientAuth\nbasicConstraints=CA:FALSE'
certificate not-for-servers authority "extendedKeyUsage=clientAuth\nbasicConstraints=CA:FALSE\n$here"
