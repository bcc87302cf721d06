// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owners of GSS-API's objects (RFC 2744).

#ifndef QUORLIN_GSSAPI_GSSHANDLES_H
#define QUORLIN_GSSAPI_GSSHANDLES_H

#include <pelmar/SecretText.h>

#include <gssapi/gssapi.h>

#include <string>

namespace Quorlin {
namespace InternalApi {

/// Owns what GSS-API calls fill in: a name, a credential or a context.
template <typename Handle, OM_uint32 (*Release)(OM_uint32*, Handle*)>
class GssHandle final {
 public:
  GssHandle() = default;
  GssHandle(GssHandle&& other) noexcept : _handle(other._handle) { other._handle = nullptr; }
  GssHandle& operator=(GssHandle&& other) noexcept {
    const Handle handle = _handle;
    _handle = other._handle;
    other._handle = handle;
    return *this;
  }
  ~GssHandle() {
    if (_handle != nullptr) {
      OM_uint32 ignored = 0;
      Release(&ignored, &_handle);
    }
  }

  Handle Get() const { return _handle; }
  /// For a call that fills it in, or that needs to change it.
  Handle* Place() { return &_handle; }

 private:
  Handle _handle = nullptr;
};

inline OM_uint32 DeleteGssContext(OM_uint32* minor, gss_ctx_id_t* context) {
  return gss_delete_sec_context(minor, context, GSS_C_NO_BUFFER);
}

using GssName = GssHandle<gss_name_t, gss_release_name>;
using GssCredential = GssHandle<gss_cred_id_t, gss_release_cred>;
using GssContext = GssHandle<gss_ctx_id_t, DeleteGssContext>;

/// Owns the bytes that a GSS-API call gives back, and wipes them: they may be what proves who the user is.
class GssBuffer final {
 public:
  GssBuffer() = default;
  GssBuffer(const GssBuffer&) = delete;
  GssBuffer& operator=(const GssBuffer&) = delete;
  ~GssBuffer() {
    Pelmar::Wipe(_buffer.value, _buffer.length);
    OM_uint32 ignored = 0;
    gss_release_buffer(&ignored, &_buffer);
  }

  gss_buffer_t Place() { return &_buffer; }
  const unsigned char* begin() const { return static_cast<const unsigned char*>(_buffer.value); }
  const unsigned char* end() const { return _buffer.length == 0 ? begin() : begin() + _buffer.length; }
  std::string ToString() const { return std::string(begin(), end()); }

 private:
  gss_buffer_desc _buffer = GSS_C_EMPTY_BUFFER;
};

}  // namespace InternalApi
}  // namespace Quorlin

#endif  // QUORLIN_GSSAPI_GSSHANDLES_H
