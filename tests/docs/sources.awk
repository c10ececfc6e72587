# SPDX-License-Identifier: Apache-2.0
# Prints a source made from one C++ block. A block with an #include is a source already, and includes all that it uses. Any
# other block is a fragment: it may use what fragment.h includes, and unless it defines a function, a class or an alias, it
# becomes the body of a function with the parameters in that file. A header's comment need not write the names of the
# libraries' namespaces. A line "..." means that code is left out.
#
# usage: awk -v number=N -v page=FILE -v line=LINE -f sources.awk BLOCK BLOCK

NR == FNR {
  isSource = isSource || /^#include /
  isDeclaration = isDeclaration || /^(class|struct|enum|namespace|using|template)[ <]/ ||
    (/^[A-Za-z_].*\)( const)?( noexcept)?( override)? \{/ && !/^(if|for|while|switch|do|try|else|return|catch)[ (]/ && !/ = |->|\[/)
  next
}

FNR == 1 {
  if (!isSource) {
    print "namespace Block" number " {"
    if (page ~ /\.h$/) {
      print "using namespace SsoClient;\nusing namespace Tarvel;"
    }
  }
  if (!isSource && !isDeclaration) {
    print "void Body(PARAMETERS) { {"
  }
  print "#line " line + 1 " \"" page "\""
}

{
  print /^ *\.\.\.$/ ? "" : $0
}

END {
  if (!isSource && !isDeclaration) {
    print "} }"
  }
  if (!isSource) {
    print "} // namespace"
  }
}
