// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "interop/kerberos/CacheCopies.h"

#include <krb5.h>

#include <ctime>
#include <memory>
#include <stdexcept>

namespace KerberosTests {

namespace {

constexpr krb5_timestamp kHour = 3600;

void Require(krb5_error_code code, const char* what) {
  if (code != 0) {
    throw std::runtime_error(std::string(what) + ": krb5 error " + std::to_string(code));
  }
}

/// A Kerberos object with the context that it belongs to.
template <typename T, auto Free>
struct Deleter {
  krb5_context context;
  void operator()(T* object) const { Free(context, object); }
};

using Context = std::unique_ptr<_krb5_context, void (*)(krb5_context)>;
using Cache = std::unique_ptr<_krb5_ccache, Deleter<_krb5_ccache, krb5_cc_close>>;
using Principal = std::unique_ptr<krb5_principal_data, Deleter<krb5_principal_data, krb5_free_principal>>;

Context MakeContext() {
  krb5_context context = nullptr;
  Require(krb5_init_context(&context), "krb5_init_context");
  return Context(context, krb5_free_context);
}

Cache Resolve(krb5_context context, const std::string& name) {
  krb5_ccache cache = nullptr;
  Require(krb5_cc_resolve(context, name.c_str(), &cache), "krb5_cc_resolve");
  return Cache(cache, {context});
}

Principal GetOwner(krb5_context context, krb5_ccache cache) {
  krb5_principal principal = nullptr;
  Require(krb5_cc_get_principal(context, cache, &principal), "krb5_cc_get_principal");
  return Principal(principal, {context});
}

void StoreExpired(krb5_context context, krb5_ccache cache, krb5_creds& ticket) {
  const krb5_timestamp shift =
      ticket.times.endtime - (static_cast<krb5_timestamp>(std::time(nullptr)) - kHour);
  ticket.times.authtime -= shift;
  ticket.times.starttime -= ticket.times.starttime == 0 ? 0 : shift;
  ticket.times.endtime -= shift;
  ticket.times.renew_till = 0;
  Require(krb5_cc_store_cred(context, cache, &ticket), "krb5_cc_store_cred");
}

Cache MakeCacheOfSameOwner(krb5_context context, krb5_ccache source, const std::string& name) {
  Cache target = Resolve(context, name);
  const Principal owner = GetOwner(context, source);
  Require(krb5_cc_initialize(context, target.get(), owner.get()), "krb5_cc_initialize");
  return target;
}

}  // namespace

void CopyOwner(const std::string& from, const std::string& to) {
  const Context context = MakeContext();
  MakeCacheOfSameOwner(context.get(), Resolve(context.get(), from).get(), to);
}

void CopyExpired(const std::string& from, const std::string& to) {
  const Context context = MakeContext();
  const Cache source = Resolve(context.get(), from);
  const Cache target = MakeCacheOfSameOwner(context.get(), source.get(), to);
  krb5_cc_cursor cursor;
  Require(krb5_cc_start_seq_get(context.get(), source.get(), &cursor), "krb5_cc_start_seq_get");
  krb5_creds ticket;
  while (krb5_cc_next_cred(context.get(), source.get(), &cursor, &ticket) == 0) {
    StoreExpired(context.get(), target.get(), ticket);
    krb5_free_cred_contents(context.get(), &ticket);
  }
  Require(krb5_cc_end_seq_get(context.get(), source.get(), &cursor), "krb5_cc_end_seq_get");
}

}  // namespace KerberosTests
