// SPDX-License-Identifier: Apache-2.0

#include "integration/signed_requests/schemas.h"

#include "integration/signed_requests/foreign_document.h"
#include "support/data_file.h"

#include <libxml/xmlIO.h>

#include <cstdarg>
#include <cstdio>
#include <stdexcept>

namespace Testing {

namespace {

void Gather(void *texts, const char *format, ...) __attribute__((format(printf, 2, 3)));
void Gather(void *texts, const char *format, ...) {
  char line[1024];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  *static_cast<std::string *>(texts) += line;
}

} // namespace

Schemas::Schemas() {
  xmlSetExternalEntityLoader(xmlNoNetExternalEntityLoader);
  const std::string path = DataPath("schemas/request.xsd");
  std::string warnings; // there is one for each schema that is imported again
  const std::unique_ptr<xmlSchemaParserCtxt, decltype(&xmlSchemaFreeParserCtxt)> parser(
      xmlSchemaNewParserCtxt(path.c_str()), &xmlSchemaFreeParserCtxt);
  xmlSchemaSetParserErrors(parser.get(), Gather, Gather, &warnings);
  m_schema.reset(xmlSchemaParse(parser.get()));
  if (!m_schema) {
    throw std::runtime_error("the schemas do not load (packages xmltooling-schemas, opensaml-schemas): " + warnings);
  }
}

std::string Schemas::Judge(const std::string &xml) const {
  const ForeignDocument document(xml);
  std::string errors;
  const std::unique_ptr<xmlSchemaValidCtxt, decltype(&xmlSchemaFreeValidCtxt)> context(
      xmlSchemaNewValidCtxt(m_schema.get()), &xmlSchemaFreeValidCtxt);
  xmlSchemaSetValidErrors(context.get(), Gather, Gather, &errors);
  const int result = xmlSchemaValidateDoc(context.get(), document.Get());
  return result == 0 ? std::string() : errors.empty() ? "internal error" : errors;
}

} // namespace Testing
