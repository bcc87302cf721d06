// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// How a host tests its own code: with GoogleTest, against a token service that runs inside the test program.
// It listens on loopback, on a port of its own, so that tests may run side by side.
//
// Link with Quorlin::devsts, which is there after add_subdirectory with QUORLIN_BUILD_DEVSTS switched on
// (docs/dev-sts.md).

#include <devsts/Service.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

// ---- The host's own code, which is to be tested ----

namespace {

/// Lets those in who are in the group "Administrators".
class Door {
 public:
  explicit Door(const Quorlin::SecurityTokenServiceConfig& config)
      : _service(Quorlin::CreateSecurityTokenService(config)) {}

  bool MayEnter(const std::string& user, const std::string& password) const {
    try {
      Quorlin::TokenSpec spec;
      spec.tokenLifetimeSec = 60;
      return IsAdministrator(*_service->AcquireToken(user, password, spec));
    } catch (const Quorlin::InvalidCredentialsException&) {
      return false;
    }
  }

 private:
  static bool IsAdministrator(const Quorlin::SamlToken& token) {
    std::vector<Quorlin::PrincipalId> groups;
    token.GetGroups(groups);
    for (const Quorlin::PrincipalId& group : groups) {
      if (group == Quorlin::PrincipalId("Administrators", "example.com")) {
        return true;
      }
    }
    return false;
  }

  boost::shared_ptr<Quorlin::SecurityTokenService> _service;
};

// ---- The tests ----

DevSts::User MakeUser(const std::string& name, const std::string& group) {
  DevSts::User user;
  user.name = name;
  user.domain = "example.com";
  user.password = "open sesame";
  DevSts::Group membership;
  membership.name = group;
  membership.domain = "example.com";
  user.groups.push_back(membership);
  return user;
}

/// A token service with users of the test's own, and how its clients are set up.
class DoorTest : public testing::Test {
 protected:
  static DevSts::ServiceConfig MakeServiceConfig() {
    DevSts::ServiceConfig config;
    config.directory = DevSts::Directory({MakeUser("ada", "Administrators"), MakeUser("guy", "Guests")});
    return config;
  }

  Quorlin::SecurityTokenServiceConfig MakeClientConfig() const {
    Pelmar::Ssl::SSLContextOptions tls;
    tls.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = service.GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
    return config;
  }

  DevSts::Service service{MakeServiceConfig()};
};

TEST_F(DoorTest, LetsAnAdministratorIn) {
  EXPECT_TRUE(Door(MakeClientConfig()).MayEnter("ada@example.com", "open sesame"));
}

TEST_F(DoorTest, KeepsAGuestOut) {
  EXPECT_FALSE(Door(MakeClientConfig()).MayEnter("guy@example.com", "open sesame"));
}

TEST_F(DoorTest, KeepsAWrongPasswordOut) {
  EXPECT_FALSE(Door(MakeClientConfig()).MayEnter("ada@example.com", "open barley"));
}

// An outage is not an answer: it is told to the caller.
TEST_F(DoorTest, TellsThatTheServiceIsAway) {
  const Door door(MakeClientConfig());
  service.Stop();
  EXPECT_THROW(door.MayEnter("ada@example.com", "open sesame"), Quorlin::CommunicationException);
}

TEST_F(DoorTest, BelievesNoTokenOfAnotherService) {
  const DevSts::Service other{MakeServiceConfig()};
  Quorlin::SecurityTokenServiceConfig config = MakeClientConfig();
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(other.GetSigningCertificate());
  EXPECT_THROW(Door(config).MayEnter("ada@example.com", "open sesame"), Quorlin::InvalidSignatureException);
}

}  // namespace
