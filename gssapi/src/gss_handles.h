// SPDX-License-Identifier: Apache-2.0
/// @file
/// Owning handles for the GSSAPI's objects: each handle frees its object.

#pragma once

#include <gssapi/gssapi.h>

#include <cstdint>
#include <vector>

namespace SsoClient::Gssapi {

/// Owns an object; null when empty.
template <typename Object, auto RELEASE>
class GssHandle {
public:
  GssHandle() noexcept = default;
  GssHandle(const GssHandle &) = delete;
  GssHandle &operator=(const GssHandle &) = delete;
  ~GssHandle() { Reset(); }

  Object Get() const noexcept { return m_object; }

  /// The place where a function replaces the object, or stores one if the handle is empty.
  Object *Slot() noexcept { return &m_object; }

  void Reset() noexcept {
    if (m_object != nullptr) {
      RELEASE(&m_object);
      m_object = nullptr;
    }
  }

private:
  Object m_object = nullptr;
};

inline void ReleaseName(gss_name_t *name) noexcept {
  OM_uint32 minor = 0;
  gss_release_name(&minor, name);
}

inline void ReleaseCredential(gss_cred_id_t *credential) noexcept {
  OM_uint32 minor = 0;
  gss_release_cred(&minor, credential);
}

inline void ReleaseContext(gss_ctx_id_t *context) noexcept {
  OM_uint32 minor = 0;
  gss_delete_sec_context(&minor, context, GSS_C_NO_BUFFER);
}

using NameHandle = GssHandle<gss_name_t, ReleaseName>;
using CredentialHandle = GssHandle<gss_cred_id_t, ReleaseCredential>;
using ContextHandle = GssHandle<gss_ctx_id_t, ReleaseContext>;

/// Octets that the GSSAPI has allocated.
class GssOctets {
public:
  GssOctets() noexcept = default;
  GssOctets(const GssOctets &) = delete;
  GssOctets &operator=(const GssOctets &) = delete;
  ~GssOctets() {
    OM_uint32 minor = 0;
    gss_release_buffer(&minor, &m_buffer);
  }

  /// The place where a function stores octets that it allocates. It must be empty.
  gss_buffer_t Slot() noexcept { return &m_buffer; }

  const std::uint8_t *begin() const noexcept { return static_cast<const std::uint8_t *>(m_buffer.value); }
  const std::uint8_t *end() const noexcept { return m_buffer.length == 0 ? begin() : begin() + m_buffer.length; }

private:
  gss_buffer_desc m_buffer = {0, nullptr};
};

} // namespace SsoClient::Gssapi
