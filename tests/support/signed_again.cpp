// SPDX-License-Identifier: Apache-2.0

#include "support/signed_again.h"

#include "support/data_file.h"
#include "support/work_folder.h"

#include <cstdlib>
#include <stdexcept>

namespace Testing {

namespace {

void Empty(std::string &xml, const std::string &element) {
  const std::size_t begin = xml.find("<" + element + ">") + element.size() + 2;
  xml.erase(begin, xml.find("</" + element, begin) - begin);
}

} // namespace

std::string SignedAgain(std::string xml) {
  Empty(xml, "ds:DigestValue");
  Empty(xml, "ds:SignatureValue");
  const WorkFolder folder;
  const std::string in = folder.Write("in.xml", xml);
  const std::string out = folder / "out.xml";
  const std::string command = "xmlsec1 --sign --privkey-pem " + DataPath("tokens/sts-rsa.key") +
                              " --id-attr:ID urn:oasis:names:tc:SAML:2.0:assertion:Assertion --output " + out + " " +
                              in + " 2>" + folder / "log";
  if (std::system(command.c_str()) != 0) {
    throw std::runtime_error(folder.Read("log"));
  }
  return folder.Read("out.xml");
}

} // namespace Testing
