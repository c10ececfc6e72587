#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes the tokens of this folder with the keys of ../tokens. OpenSAML and WSS4J make the tokens in details.txt, and
# details.txt itself; xmlsec1 makes the other tokens. The script does not make expected.tsv.
# usage: make.sh JARS      a folder with the jars of org.apache.wss4j:wss4j-ws-security-dom:2.4.3 (Maven Central) and of its
#                          dependencies, such as OpenSAML 3.4.6 and Santuario 2.3.4; Java 17 or later
set -euo pipefail
[ $# -eq 1 ] || { sed -n 's/^# usage: /usage: /p' "$0" >&2; exit 2; }
jars=$(cd "$1" && pwd)
cd "$(dirname "$0")"

work=$(mktemp -d)
trap 'rm -r "$work"' EXIT
javac -cp "$jars/*" -d "$work" make/*.java
java -cp "$work:$jars/*" MakeTokens ../tokens .
./make.py
