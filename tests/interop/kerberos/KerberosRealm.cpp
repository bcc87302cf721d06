// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "interop/kerberos/KerberosRealm.h"

#include "interop/kerberos/CacheCopies.h"
#include "support/LoopbackServer.h"
#include "support/Process.h"

#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <system_error>
#include <vector>

namespace KerberosTests {

namespace {

using TestSupport::ProcessResult;

/// A port that was free a moment ago may be taken by now.
constexpr int kMaxStarts = 20;

constexpr const char* kPrincipals =
    "addprinc -pw secret alice\n"
    "addprinc -pw carol's carol\n"
    "addprinc -pw mallory's mallory/admin\n"
    "addprinc -randkey HTTP/localhost\n"
    "addprinc -randkey HTTP/127.0.0.1\n"
    "addprinc -randkey HTTP/elsewhere\n";

/// The administrative programs are where an ordinary user's path does not lead.
void ExtendPath() {
  const char* const path = std::getenv("PATH");
  static const EnvironmentVariable extended(
      "PATH", std::string(path == nullptr ? "" : path) + ":/usr/local/sbin:/usr/sbin:/sbin");
}

std::string Run(const char* package, const std::vector<std::string>& arguments,
                const std::string& input = "") {
  ProcessResult result;
  try {
    result = TestSupport::RunProcess(arguments, input);
  } catch (const std::system_error& error) {
    throw std::runtime_error(std::string(error.what()) + " (it comes with the Debian package " + package +
                             ")");
  }
  if (result.exitCode != 0) {
    throw std::runtime_error(arguments[0] + " failed: " + result.standardOutput + result.standardError);
  }
  return result.standardOutput;
}

int FindFreePort() {
  // Free again when this function returns: the key distribution center cannot be handed a socket.
  return TestSupport::ClosedPort().GetPort();
}

}  // namespace

EnvironmentVariable::EnvironmentVariable(const std::string& name, const std::string& value) : _name(name) {
  if (const char* const before = std::getenv(name.c_str())) {
    _before = before;
  }
  setenv(name.c_str(), value.c_str(), 1);
}

EnvironmentVariable::~EnvironmentVariable() {
  if (_before) {
    setenv(_name.c_str(), _before->c_str(), 1);
  } else {
    unsetenv(_name.c_str());
  }
}

const KerberosRealm& KerberosRealm::Shared() {
  static const KerberosRealm realm;
  return realm;
}

KerberosRealm::KerberosRealm()
    : _configuration("KRB5_CONFIG", _files.GetPath("krb5.conf")),
      _kdcProfile("KRB5_KDC_PROFILE", _files.GetPath("kdc.conf")),
      _defaultCache("KRB5CCNAME", GetCache()),
      _replayCache("KRB5RCACHENAME", "file2:" + _files.GetPath("replays")) {
  ExtendPath();
  Configure(0);
  CreateDatabase();
  StartKdc();
  LogIn("alice", "secret", "cache");
}

KerberosRealm::~KerberosRealm() {
  StopKdc();
}

void KerberosRealm::StopKdc() {
  if (_logReader.joinable()) {
    _kdc->Signal(SIGKILL);
    _logReader.join();
    _kdc->Wait();
  }
}

void KerberosRealm::Configure(int port) const {
  const std::string address = "127.0.0.1:" + std::to_string(port);
  _files.WriteFile("krb5.conf",
                   "[libdefaults]\n"
                   "  default_realm = EXAMPLE.COM\n"
                   "  dns_lookup_kdc = false\n"
                   "  dns_lookup_realm = false\n"
                   "  dns_canonicalize_hostname = false\n"
                   "  rdns = false\n"
                   "  qualify_shortname = \"\"\n"
                   "  udp_preference_limit = 1\n"
                   "[realms]\n"
                   "  EXAMPLE.COM = {\n"
                   "    kdc = " +
                       address +
                       "\n"
                       "  }\n"
                       "[domain_realm]\n"
                       "  .other.example = OTHER.EXAMPLE\n");
  _files.WriteFile("kdc.conf",
                   "[kdcdefaults]\n"
                   "  kdc_listen = \"\"\n"
                   "  kdc_tcp_listen = " +
                       address +
                       "\n"
                       "[realms]\n"
                       "  EXAMPLE.COM = {\n"
                       "    database_name = " +
                       _files.GetPath("principals") +
                       "\n"
                       "    key_stash_file = " +
                       _files.GetPath("stash") +
                       "\n"
                       "    supported_enctypes = aes256-cts:normal\n"
                       "  }\n"
                       "[logging]\n"
                       "  kdc = FILE:/dev/stdout\n");
}

void KerberosRealm::CreateDatabase() const {
  Run("krb5-kdc", {"kdb5_util", "create", "-s", "-P", "master"});
  const std::string out =
      Run("krb5-admin-server", {"kadmin.local"},
          kPrincipals + std::string("ktadd -k ") + GetKeytab() + " HTTP/localhost HTTP/127.0.0.1\nktadd -k " +
              GetKeytabOfElsewhere() + " HTTP/elsewhere\n");
  // It returns 0 whatever became of its commands.
  if (out.find("HTTP/elsewhere with kvno") == std::string::npos) {
    throw std::runtime_error("kadmin.local failed: " + out);
  }
}

void KerberosRealm::StartKdc() {
  for (int start = 0;; ++start) {
    Configure(FindFreePort());
    // It ends with the test even when that crashes.
    _kdc = std::make_unique<StsTests::ChildProcess>(
        std::vector<std::string>{"/usr/bin/setpriv", "--pdeathsig", "KILL", "krb5kdc", "-n"},
        StsTests::ChildProcess::Terminal::NONE);
    try {
      _kdc->ReadUntil("commencing operation");
      break;
    } catch (const std::runtime_error&) {
      if (start == kMaxStarts) {
        throw;
      }
    }
  }
  // Nobody needs the log, but a pipe that is full would stop its writer.
  _logReader = std::thread([this] { _kdc->ReadAll(); });
}

std::string KerberosRealm::LogIn(const std::string& user, const std::string& password,
                                 const std::string& cacheName) const {
  const std::string cache = MakeCacheName(cacheName);
  Run("krb5-user", {"kinit", "-c", cache, user}, password + "\n");
  return cache;
}

std::string KerberosRealm::MakeEmptyCache(const std::string& cacheName) const {
  const std::string cache = MakeCacheName(cacheName);
  CopyOwner(GetCache(), cache);
  return cache;
}

std::string KerberosRealm::MakeExpiredCache(const std::string& cacheName) const {
  const std::string cache = MakeCacheName(cacheName);
  CopyExpired(GetCache(), cache);
  return cache;
}

}  // namespace KerberosTests
