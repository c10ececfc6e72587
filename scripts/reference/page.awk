# SPDX-License-Identifier: Apache-2.0
# What Doxygen reads of a page: the same lines, changed where Doxygen's Markdown differs from that of code hosts.
# - Doxygen ends a code span at an apostrophe, unless two backticks begin and end the span.
# - Doxygen reads "@name" as a command.
# - The identifier of a page is its path. The identifier of a heading is the page's, followed by the one that code hosts give the
#   heading. Links use these identifiers.
# - A link to a file that is not part of the reference becomes a path from build/docs/html to that file.

BEGIN {
  page = ARGV[1]
  sub("^" ENVIRON["PWD"] "/", "", page)
  folder = page
  sub(/[^\/]*$/, "", folder)
}

# The identifier of a page.
function PageOf(path) {
  while (path ~ /[^\/.]+\/\.\.\//) {
    sub(/[^\/.]+\/\.\.\//, "", path)
  }
  sub(/\.md$/, "", path)
  gsub(/\//, "-", path)
  return path == "docs-guide-README" ? "index" : path
}

# The identifier of a heading of a page, from the page's path and the heading's text or identifier.
function HeadingOf(path, heading) {
  heading = tolower(heading)
  gsub(/[^a-z0-9 _-]/, "", heading)
  gsub(/ /, "-", heading)
  return PageOf(path) "-" heading
}

function Plain(text) {
  gsub(/@/, "\\\\@", text)
  return text
}

function MakeSpansPlain(line, before, span) {
  before = ""
  while (match(line, /``([^`]|`[^`])*``|`[^`]+`/)) {
    span = substr(line, RSTART, RLENGTH)
    if (span ~ /^`[^`].*'/) {
      span = "`" span "`"
    }
    before = before Plain(substr(line, 1, RSTART - 1)) span
    line = substr(line, RSTART + RLENGTH)
  }
  return before Plain(line)
}

function TargetOf(target, hash) {
  hash = index(target, "#")
  if (target ~ /^https?:/) {
    return target
  }
  if (hash > 0) {
    return "#" HeadingOf(hash == 1 ? page : folder substr(target, 1, hash - 1), substr(target, hash + 1))
  }
  return target ~ /\.md$/ ? "#" PageOf(folder target) : "../../../" folder target
}

function LeadLinks(line, before) {
  before = ""
  while (match(line, /\]\([^)]*\)/)) {
    before = before substr(line, 1, RSTART + 1) TargetOf(substr(line, RSTART + 2, RLENGTH - 3)) ")"
    line = substr(line, RSTART + RLENGTH)
  }
  return before line
}

/^ *```/ {
  isCode = !isCode
  print
  next
}

isCode {
  print
  next
}

FNR == 1 && /^# / && PageOf(page) != "index" {
  print MakeSpansPlain($0) " {#" PageOf(page) "}"
  next
}

/^##+ / {
  heading = $0
  sub(/^#+ /, "", heading)
  print MakeSpansPlain($0) " {#" HeadingOf(page, heading) "}"
  next
}

{
  print LeadLinks(MakeSpansPlain($0))
}
