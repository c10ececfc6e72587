#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes the token fixtures of this folder from templates/, with openssl, xmllint and xmlsec1 (1.2.37 or later).
# Keys and certificates are made only when they are missing, so that existing signatures stay valid. RSA PKCS#1 signatures are
# the same in each run; PSS and ECDSA signatures differ.
set -euo pipefail
cd "$(dirname "$0")"

C14N=http://www.w3.org/TR/2001/REC-xml-c14n-20010315
EXCLUSIVE=http://www.w3.org/2001/10/xml-exc-c14n#
MORE=http://www.w3.org/2001/04/xmldsig-more#
SHA256=http://www.w3.org/2001/04/xmlenc#sha256
ASSERTION=urn:oasis:names:tc:SAML:2.0:assertion:Assertion

# certificate NAME KEY SUBJECT [FROM TO]: makes a self-signed certificate for the key in KEY.key. With `openssl ca`, because
# `openssl req` accepts no dates before OpenSSL 3.4.
certificate() {
  local name=$1 key=$2 subject=$3 from=${4:-20200101000000Z} to=${5:-21200101000000Z} ca
  [ ! -f "$name.crt" ] || return 0
  ca=$(mktemp -d)
  touch "$ca/index"
  cat >"$ca/ca.cnf" <<END
[ca]
default_ca = here
[here]
database = $ca/index
new_certs_dir = $ca
serial = $ca/serial
default_md = sha256
policy = names
[names]
O = supplied
CN = supplied
END
  openssl req -new -key "$key.key" -subj "$subject" -out "$ca/request"
  openssl ca -config "$ca/ca.cnf" -batch -notext -create_serial -selfsign -keyfile "$key.key" -in "$ca/request" \
    -startdate "$from" -enddate "$to" -out "$name.crt" 2>/dev/null
  rm -r "$ca"
}

# identity NAME COMMON_NAME KEY_OPTIONS...: makes a key with its certificate.
identity() {
  local name=$1 commonName=$2
  shift 2
  [ -f "$name.key" ] || openssl genpkey -quiet "$@" -out "$name.key"
  certificate "$name" "$name" "/O=Example/CN=$commonName"
}

identity sts-rsa sts -algorithm RSA -pkeyopt rsa_keygen_bits:2048
identity sts-rsa-2 "sts 2" -algorithm RSA -pkeyopt rsa_keygen_bits:2048
identity sts-rsa3072 "sts 3072" -algorithm RSA -pkeyopt rsa_keygen_bits:3072
identity sts-rsa1024 "sts 1024" -algorithm RSA -pkeyopt rsa_keygen_bits:1024
identity sts-ec256 "sts P-256" -algorithm EC -pkeyopt ec_paramgen_curve:P-256
identity sts-ec384 "sts P-384" -algorithm EC -pkeyopt ec_paramgen_curve:P-384
identity sts-ec521 "sts P-521" -algorithm EC -pkeyopt ec_paramgen_curve:P-521
identity other "not trusted" -algorithm RSA -pkeyopt rsa_keygen_bits:2048
identity holder holder -algorithm RSA -pkeyopt rsa_keygen_bits:2048
# More certificates for the first key; one has expired.
certificate sts-rsa-reissued sts-rsa "/O=Example/CN=sts reissued"
certificate sts-rsa-expired sts-rsa "/O=Example/CN=sts expired" 20200101000000Z 20210101000000Z
cat sts-rsa.crt sts-rsa-2.crt >sts-bundle.pem
cat sts-rsa.crt sts-rsa.key >certificate-with-key.pem
openssl x509 -in sts-rsa.crt -outform DER -out sts-rsa.der

# unsigned NAME TEMPLATE [option=value...]: prints the token before it is signed.
unsigned() {
  local name=$1 template=$2 signature=signature c14n=$EXCLUSIVE transform='' method=${MORE}rsa-sha256 digest=$SHA256
  local notBefore=2020-01-01T00:00:00.000Z notOnOrAfter=2120-01-01T00:00:00.000Z groups=0 pretty=false uri
  local id
  id=$(printf %s "$name" | sha256sum | sed -E 's/^(.{8})(.{4})(.{4})(.{4})(.{12}).*/\1-\2-\3-\4-\5/')
  uri="#_$id"
  shift 2
  [ $# -eq 0 ] || local "$@"
  local holder
  holder=$(grep -v -e ----- holder.crt | tr -d '\n')
  local sed=(-e "/@SIGNATURE@/{r templates/$signature.xml.in" -e "d}")
  # In the default-namespace style the signature has no prefixes either.
  local style=cat
  [ "$template" != default-namespace ] || style='sed -e s,<ds:,<, -e s,</ds:,</,g -e s,<ds:,<,g -e s,xmlns:ds=,xmlns=,'
  sed "${sed[@]}" "templates/$template.xml.in" | $style |
    awk -v count="$groups" '/@GROUPS@/ { for (i = 1; i <= count; ++i) { line = $0
          sub("@GROUPS@", sprintf("corp.example\\Department %04d Members", i), line); print line } next } { print }' |
    sed -e "s,@ID@,$id,g" -e "s,@C14N@,$c14n," -e "s,@TRANSFORM@,${transform:-$c14n}," -e "s,@METHOD@,$method," \
      -e "s,@DIGEST@,$digest," -e "s,@URI@,$uri," -e "s,@NOT_BEFORE@,$notBefore," \
      -e "s,@NOT_ON_OR_AFTER@,$notOnOrAfter," -e "s,@HOLDER_CERTIFICATE@,$holder," |
    if $pretty; then cat; else xmllint --noblanks - | sed -e '1{/^<?xml/d}'; fi
}

# token NAME TEMPLATE KEY [option=value...]: makes NAME.xml, signed with KEY, and verifies it.
token() {
  local name=$1 key=$3
  unsigned "$name" "$2" "${@:4}" >"$name.tmp"
  xmlsec1 --sign --privkey-pem "$key.key,$key.crt" --id-attr:ID $ASSERTION --output "$name.xml" "$name.tmp"
  rm "$name.tmp"
  xmlsec1 --verify --pubkey-cert-pem "$key.crt" --id-attr:ID $ASSERTION "$name.xml" >/dev/null 2>&1 ||
    { echo "$name: does not verify"; exit 1; }
}

# pss_token NAME TEMPLATE KEY BITS: xmlsec1 1.2 does not support RSA-PSS, so it makes the token with PKCS#1 and canonicalises
# `SignedInfo`; then openssl signs those octets with the algorithm's name replaced.
pss_token() {
  local name=$1 key=$3 bits=$4 pkcs1=${MORE}rsa-sha$4 pss=http://www.w3.org/2007/05/xmldsig-more#sha$4-rsa-MGF1 value
  unsigned "$name" "$2" "method=$pkcs1" >"$name.tmp"
  xmlsec1 --sign --store-signatures --privkey-pem "$key.key,$key.crt" --id-attr:ID $ASSERTION --output "$name.xml" \
    "$name.tmp" >"$name.log" 2>&1
  sed -n '/^== PreSigned data - start buffer:$/,/^== PreSigned data - end buffer$/p' "$name.log" | sed -e '1d;$d' |
    tr -d '\n' | sed -e "s,$pkcs1,$pss," >"$name.octets"
  openssl dgst "-sha$bits" -sign "$key.key" -sigopt rsa_padding_mode:pss -sigopt rsa_pss_saltlen:digest \
    -out "$name.signature" "$name.octets"
  openssl x509 -in "$key.crt" -noout -pubkey >"$name.pub"
  openssl dgst "-sha$bits" -verify "$name.pub" -sigopt rsa_padding_mode:pss -signature "$name.signature" "$name.octets" \
    >/dev/null
  value=$(base64 -w0 "$name.signature")
  tr '\n' '\r' <"$name.xml" | sed -E -e "s,$pkcs1,$pss," \
    -e "s,(<ds:SignatureValue>)[^<]*,\1$value," | tr '\r' '\n' >"$name.tmp"
  mv "$name.tmp" "$name.xml"
  rm "$name.log" "$name.octets" "$name.signature" "$name.pub"
}

token bearer bearer sts-rsa
token bearer-minimal minimal sts-rsa signature=signature-without-keyinfo
token holder-of-key holder-of-key sts-rsa
token delegated delegated sts-rsa
token full full sts-rsa
token bearer-5k groups sts-rsa groups=12
token bearer-50k groups sts-rsa groups=608

# Not valid now.
token expired bearer sts-rsa notOnOrAfter=2021-01-01T00:00:00.000Z
token early bearer sts-rsa notBefore=2110-01-01T00:00:00.000Z

# Signed with another key.
token signed-by-second bearer sts-rsa-2
token signed-by-other bearer other

# Canonicalisation algorithms.
token c14n-inclusive full sts-rsa c14n=$C14N
token c14n-inclusive-with-comments pretty sts-rsa "c14n=$C14N#WithComments" pretty=true
token c14n-exclusive-with-comments pretty sts-rsa "c14n=${EXCLUSIVE}WithComments" pretty=true
token c14n-inclusive-prefixes prefixes-on-root sts-rsa signature=signature-inclusive-prefixes
token c14n-mixed full sts-rsa c14n=$C14N transform=$EXCLUSIVE

# Styles of prefixes and white space.
token style-default-namespace default-namespace sts-rsa
token style-prefixes-on-root prefixes-on-root sts-rsa
token style-prefixes-on-root-inclusive prefixes-on-root sts-rsa c14n=$C14N
token style-pretty pretty sts-rsa pretty=true

# Algorithms.
for bits in 256 384 512; do
  case $bits in
    256) digest=$SHA256 ;;
    384) digest=${MORE}sha384 ;;
    512) digest=http://www.w3.org/2001/04/xmlenc#sha512 ;;
  esac
  token rsa-sha$bits bearer sts-rsa "method=${MORE}rsa-sha$bits" "digest=$digest"
  pss_token rsa-pss-sha$bits bearer sts-rsa $bits
  for curve in 256 384 521; do
    token ecdsa-p$curve-sha$bits bearer sts-ec$curve "method=${MORE}ecdsa-sha$bits" "digest=$digest"
  done
done
token rsa3072 bearer sts-rsa3072
token rsa1024 bearer sts-rsa1024

# References.
token reference-empty-uri bearer sts-rsa uri=
token reference-two bearer sts-rsa signature=signature-two-references
