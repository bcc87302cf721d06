// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A Kerberos realm of MIT's, with a key distribution center on loopback.

#ifndef QUORLIN_TESTS_INTEROP_KERBEROS_KERBEROSREALM_H
#define QUORLIN_TESTS_INTEROP_KERBEROS_KERBEROSREALM_H

#include "apps/ChildProcess.h"
#include "support/TemporaryDirectory.h"

#include <memory>
#include <optional>
#include <string>
#include <thread>

namespace KerberosTests {

/// A variable of this process's environment that has its old value back at the end.
class EnvironmentVariable final {
 public:
  EnvironmentVariable(const std::string& name, const std::string& value);
  EnvironmentVariable(const EnvironmentVariable&) = delete;
  EnvironmentVariable& operator=(const EnvironmentVariable&) = delete;
  ~EnvironmentVariable();

 private:
  std::string _name;
  std::optional<std::string> _before;
};

/// The realm EXAMPLE.COM, in a directory that goes away with it. It knows
/// - the users alice (password "secret"), carol ("carol's") and mallory/admin ("mallory's"),
/// - the services HTTP/localhost and HTTP/127.0.0.1, whose keys are in the keytab,
/// - and HTTP/elsewhere, whose key is in a keytab of its own.
/// Alice has a ticket in the default cache. The process's environment points to the realm, so that programs
/// that it starts find it too.
class KerberosRealm final {
 public:
  /// The one that the tests of a process share.
  static const KerberosRealm& Shared();

  /// Throws std::runtime_error, naming the Debian package of a program that is missing.
  KerberosRealm();
  KerberosRealm(const KerberosRealm&) = delete;
  KerberosRealm& operator=(const KerberosRealm&) = delete;
  ~KerberosRealm();

  std::string GetKeytab() const { return _files.GetPath("service.keytab"); }
  std::string GetKeytabOfElsewhere() const { return _files.GetPath("elsewhere.keytab"); }
  /// The default credential cache: "FILE:..."
  std::string GetCache() const { return MakeCacheName("cache"); }
  /// The name of a cache that does not exist yet.
  std::string MakeCacheName(const std::string& name) const { return "FILE:" + _files.GetPath(name); }
  const TestSupport::TemporaryDirectory& GetFiles() const { return _files; }

  /// A new cache with a ticket of `user`, as kinit gets it.
  std::string LogIn(const std::string& user, const std::string& password, const std::string& cacheName) const;
  /// From now on nobody answers for the realm.
  void StopKdc();
  /// A new cache of alice's without a ticket.
  std::string MakeEmptyCache(const std::string& cacheName) const;
  /// A new cache with alice's ticket as it looks when it has expired an hour ago.
  std::string MakeExpiredCache(const std::string& cacheName) const;

 private:
  void Configure(int port) const;
  void CreateDatabase() const;
  void StartKdc();

  TestSupport::TemporaryDirectory _files;
  EnvironmentVariable _configuration;
  EnvironmentVariable _kdcProfile;
  EnvironmentVariable _defaultCache;
  EnvironmentVariable _replayCache;
  std::unique_ptr<StsTests::ChildProcess> _kdc;
  std::thread _logReader;
};

}  // namespace KerberosTests

#endif  // QUORLIN_TESTS_INTEROP_KERBEROS_KERBEROSREALM_H
