// SPDX-License-Identifier: Apache-2.0

#include "charset.h"

#include <libxml/encoding.h>
#include <libxml/tree.h>
#include <libxml/xmlIO.h>

#include <limits>
#include <memory>
#include <new>
#include <stdexcept>

#include <strings.h>

namespace DevSts {

namespace {

using Buffer = std::unique_ptr<xmlBuffer, void (*)(xmlBuffer *)>;

Buffer NewBuffer() {
  Buffer buffer(xmlBufferCreate(), xmlBufferFree);
  if (!buffer) {
    throw std::bad_alloc();
  }
  return buffer;
}

int LengthOf(std::string_view text) {
  if (text.size() > static_cast<std::size_t>(std::numeric_limits<int>::max())) {
    throw std::runtime_error("a message is too long to be recoded");
  }
  return static_cast<int>(text.size());
}

std::string ToString(const xmlBuffer &buffer) {
  return {reinterpret_cast<const char *>(xmlBufferContent(&buffer)),
          static_cast<std::size_t>(xmlBufferLength(&buffer))};
}

xmlCharEncodingHandler &HandlerFor(const std::string &name) {
  xmlCharEncodingHandler *const handler = xmlFindCharEncodingHandler(name.c_str());
  if (!handler) {
    throw std::runtime_error("libxml2 has no encoder for " + name);
  }
  return *handler;
}

} // namespace

std::optional<std::string> Charset::Decode(std::string_view message) const {
  if (IsUtf8()) {
    return std::string(message);
  }
  const std::unique_ptr<xmlCharEncodingHandler, int (*)(xmlCharEncodingHandler *)> handler(&HandlerFor(m_name),
                                                                                           xmlCharEncCloseFunc);
  const Buffer in = NewBuffer();
  const Buffer out = NewBuffer();
  xmlBufferAdd(in.get(), reinterpret_cast<const xmlChar *>(message.data()), LengthOf(message));
  while (xmlBufferLength(in.get()) > 0) {
    const int before = xmlBufferLength(in.get());
    xmlCharEncInFunc(handler.get(), out.get(), in.get());
    if (xmlBufferLength(in.get()) == before) {
      return std::nullopt;
    }
  }
  return ToString(*out);
}

std::string Charset::Encode(const std::string &answer) const {
  if (IsUtf8() || answer.empty()) {
    return answer;
  }
  const Buffer buffer = NewBuffer();
  xmlOutputBuffer *const out = xmlOutputBufferCreateBuffer(buffer.get(), &HandlerFor(m_name));
  if (!out) {
    throw std::bad_alloc();
  }
  const int written = xmlOutputBufferWrite(out, LengthOf(answer), answer.data());
  if (xmlOutputBufferClose(out) < 0 || written < 0) { // closing also releases the handler
    throw std::runtime_error("an answer cannot be written in " + m_name);
  }
  return "<?xml version=\"1.0\" encoding=\"" + m_name + "\"?>" + ToString(*buffer);
}

std::string Charset::ContentType(std::string_view mediaType) const {
  return std::string(mediaType) + "; charset=" + (IsUtf8() ? "utf-8" : m_name);
}

bool Charset::IsUtf8() const {
  return strcasecmp(m_name.c_str(), "UTF-8") == 0;
}

} // namespace DevSts
