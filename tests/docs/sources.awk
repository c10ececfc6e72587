# SPDX-License-Identifier: Apache-2.0
# Makes a source of one C++ block, on standard output. A block with an #include is a source as it is, which includes all
# that it uses. Any other is a fragment: it may use what fragment.h includes, and unless it defines a function, a class or
# an alias, it is a block in a function with the parameters that are named there. In a header's comment the names of the
# libraries' namespaces may be used alone. A line "..." stands for code that is left out.
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
