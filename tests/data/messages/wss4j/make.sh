#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
# Makes the messages of this folder and expected.tsv with WSS4J, with the keys of ../../tokens and ../../crypto; xmlsec1 (1.2.37
# or later) must verify each signature that it can read. tests/interop/README.md states what Java libraries this needs.
# Identifiers differ in each run, and so do all signatures.
set -euo pipefail
cd "$(dirname "$0")/../../../.."

out=tests/data/messages/wss4j
tests/interop/fetch
rm -f "$out"/*.xml
java -cp 'build/interop/classes:build/interop/lib/*' interop.judge.MessageFixtures tests/data "$out"
