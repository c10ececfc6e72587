# SPDX-License-Identifier: Apache-2.0
# Extracts the code blocks from pages and header comments: writes block N to the file FOLDER/N.LANGUAGE, and prints
# "N LANGUAGE FILE LINE", where LINE is the line before the block's first one. A block without a language, or in an unknown
# language, is an error. In a header's comment, lines that are indented by four after an empty line are a C++ block, too.
#
# usage: awk -v folder=FOLDER -f blocks.awk FILE…

BEGIN {
  split("cpp cmake sh text json", known)
  for (i in known) {
    isKnown[known[i]] = 1
  }
}

function Fail(place, message) {
  print place ": " message > "/dev/stderr"
  hasFailed = 1
}

function Begin(language, line) {
  begun = FILENAME ":" line
  output = folder "/" ++count "." language
  printf "" > output
  print count, language, FILENAME, line
}

function EndIndented() {
  if (isIndented) {
    close(output)
    output = ""
    isIndented = 0
  }
}

FNR == 1 {
  EndIndented()
  if (output) {
    Fail(begun, "this code block does not end")
  }
  output = ""
  isHeader = FILENAME ~ /\.h$/
}

isHeader && !/^ *\/\/\// {
  EndIndented()
  isAfterEmpty = 0
  next
}

isHeader {
  sub(/^ *\/\/\/ ?/, "")
  if (/^    / && (isAfterEmpty || isIndented)) {
    if (!isIndented) {
      Begin("cpp", FNR - 1)
      isIndented = 1
    }
    print > output
    next
  }
  EndIndented()
  isAfterEmpty = /^$/
}

/^ *```/ && !output {
  language = $0
  sub(/^ *```/, "", language)
  if (!isKnown[language]) {
    Fail(FILENAME ":" FNR, "a code block in the language '" language "', not one of cpp, cmake, sh, text and json")
  }
  Begin(language, FNR)
  next
}

/^ *```/ {
  close(output)
  output = ""
  next
}

output {
  print > output
}

END {
  if (output && !isIndented) {
    Fail(begun, "this code block does not end")
  }
  exit hasFailed
}
