# SPDX-License-Identifier: Apache-2.0
# Takes the code blocks out of pages and header comments: block N becomes the file FOLDER/N.LANGUAGE, and is listed as
# "N LANGUAGE FILE LINE" with the line before its first one. A block without a language, or with one that is not known
# here, is an error.
#
# usage: awk -v folder=FOLDER -f blocks.awk FILE…

BEGIN {
  split("cpp cmake sh text json", known)
  for (i in known) {
    isKnown[known[i]] = 1
  }
}

function Fail(message) {
  print FILENAME ":" FNR ": " message > "/dev/stderr"
  hasFailed = 1
}

FNR == 1 {
  if (output) {
    Fail("the page before ends within a code block")
  }
  output = ""
  isHeader = FILENAME ~ /\.h$/
}

isHeader && !/^ *\/\/\// {
  next
}

isHeader {
  sub(/^ *\/\/\/ ?/, "")
}

/^ *```/ && !output {
  language = $0
  sub(/^ *```/, "", language)
  if (!isKnown[language]) {
    Fail("a code block in the language '" language "', not one of cpp, cmake, sh, text and json")
  }
  output = folder "/" ++count "." language
  printf "" > output
  print count, language, FILENAME, FNR
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
  if (output) {
    Fail("ends within a code block")
  }
  exit hasFailed
}
