# SPDX-License-Identifier: Apache-2.0
# What Doxygen reads of a public header: the same lines, but with everything made explicit that a reader of the header infers.
# - Declarations without a blank line between them share the comment above the first, or above the namespace that begins with
#   them; each gets it. What overrides a function has that function's comment.
# - In a group of members (@name, @{) each gets the group's comment.
# - Functions that copy, move or destroy, and operator(), are left out unless they have a comment of their own: the class's
#   comment says what there is to say. So are friends.
# - What is protected is for the library's own classes, not for callers.
# The number of lines stays the same, so that a warning has the right number.

# The part of a line that is code, with its string literals emptied.
function CodeOf(line) {
  gsub(/"([^"\\]|\\.)*"/, "\"\"", line)
  sub(/\/\/.*$/, "", line)
  return line
}

function CountOf(text, character) {
  return gsub(character, "", text)
}

# Whether the code declares a special member function, or a friend.
function IsSpecialMember(code, name) {
  if (code ~ /= (default|delete);/ || code ~ /operator(=|\(\))\(/ || code ~ /^ *(virtual )?~/ || code ~ /^ *friend class /) {
    return 1
  }
  name = code
  sub(/^ *(explicit )?/, "", name)
  if (name !~ /^[A-Za-z]+\((const )?[A-Za-z]+ &/) {
    return 0
  }
  sub(/\(.*/, "", name)
  return code ~ (name "\\(const " name " &[a-z]*\\)") || code ~ (name "\\(" name " &&[a-z]*\\)")
}

# Finds out, from one line of a declaration, whether the declaration continues on the next line.
function Advance(code, net) {
  net = CountOf(code, "{") - CountOf(code, "}")
  if (bodyDepth > 0 || (net > 0 && code !~ /^ *(template <.*> )?(typedef )?(class|struct|enum|union|namespace|extern)( |$)/)) {
    bodyDepth += net
    isContinued = bodyDepth > 0
  } else {
    isContinued = code !~ /[;{}] *$/
    if (net != 0 && code !~ /^ *namespace /) {
      shared = ""
    }
  }
}

isMacro || /^ *#/ {
  isMacro = /\\$/
  print
  next
}

/^ *\/\/\/($|[^<])/ {
  if (!isComment) {
    text = ""
  }
  content = $0
  sub(/^ *\/\/\/ ?/, "", content)
  isComment = 1
  if (content ~ /^@\{/) {
    isFresh = 0
    shared = text
  } else {
    text = text (text == "" || content ~ /^@name / ? "" : " ") (content ~ /^@name / ? "" : content)
    isFresh = 1
  }
  print
  next
}

/^ *\/\// {
  print
  next
}

/^ *$/ {
  isFresh = isComment = 0
  shared = ""
  print
  next
}

/^ *(public|protected|private):/ {
  sub(/protected:/, "private:")
  isFresh = isComment = 0
  shared = ""
  print
  next
}

{
  code = CodeOf($0)
  if (!isContinued) {
    isLeftOut = 0
    if (isFresh) {
      shared = text
    } else if (IsSpecialMember(code)) {
      isLeftOut = 1
    } else if (shared != "" && $0 !~ /\/\/\/</ && code !~ / override[ ;]/ && code !~ /^ *[{}]/) {
      match($0, /^ */)
      $0 = substr($0, 1, RLENGTH) "/** " shared " */ " substr($0, RLENGTH + 1)
    }
  }
  isFresh = isComment = 0
  Advance(code)
  print isLeftOut ? "" : $0
}
