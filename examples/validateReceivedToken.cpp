// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// What a server does with a token that a client sent: checks it, checks that it is meant for this server and
// that the client may use it, and only then believes what it says.
//
//   validateReceivedToken STS.pem AUDIENCE [CLIENT.pem] < token.xml
//
// STS.pem holds the certificates of the token service, AUDIENCE is the URI by which this server is known, and
// CLIENT.pem the certificate that the client has proved to own, by TLS for example.

#include <quorlin/quorlin.h>

#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

typedef boost::shared_ptr<const Quorlin::SamlToken> Token;
typedef Pelmar::Ref<const Pelmar::Crypto::Certificate> Certificate;

/// Clocks of two machines may differ by this much.
const long long kClockToleranceSec = 60;

/// The token holds, but it does not let this client in here.
class NotForUs : public std::runtime_error {
 public:
  explicit NotForUs(const std::string& reason) : std::runtime_error(reason) {}
};

std::string ReadFile(const char* path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error(std::string("cannot read ") + path);
  }
  return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

/// A token without audience is for everybody; one with an audience has to name us. The library leaves this to
/// the server, which alone knows its own name.
void RequireAudience(const Quorlin::SamlToken& token, const std::string& ownUri) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  if (!audience.empty() && audience.count(ownUri) == 0) {
    throw NotForUs("the token is for another service");
  }
}

/// A holder-of-key token is worth nothing without proof of the key: the certificate that the client proved to
/// own, in the TLS handshake say, has to be the one in the token.
void RequireHolder(const Quorlin::SamlToken& token, const Certificate& client) {
  if (token.GetConfirmationMethod() != Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY) {
    return;
  }
  if (!client || client->GetDer() != token.GetConfirmationCertificate()->GetDer()) {
    throw NotForUs("the client has not proved to hold the token's key");
  }
}

Token Check(const std::string& xml, const std::list<Certificate>& trusted, const std::string& ownUri,
            const Certificate& client) {
  const Token token = Quorlin::CreateSamlToken(xml, trusted, kClockToleranceSec);
  RequireAudience(*token, ownUri);
  RequireHolder(*token, client);
  return token;
}

void PrintCaller(const Quorlin::SamlToken& token) {
  std::cout << "welcome " << token.GetSubject().ToString() << "\n";
  std::vector<Quorlin::PrincipalId> groups;
  token.GetGroups(groups);
  for (const Quorlin::PrincipalId& group : groups) {
    std::cout << "group " << group.ToString() << "\n";
  }
}

int Refuse(const std::string& why) {
  std::cerr << "refused: " << why << "\n";
  return 1;
}

int Run(int argc, char** argv) {
  const std::list<Certificate> trusted = Pelmar::Crypto::CreateCertificatesFromPem(ReadFile(argv[1]));
  const Certificate client =
      argc == 4 ? Pelmar::Crypto::CreateCertificateFromPem(ReadFile(argv[3])) : Certificate();
  const std::string xml((std::istreambuf_iterator<char>(std::cin)), std::istreambuf_iterator<char>());

  try {
    PrintCaller(*Check(xml, trusted, argv[2], client));
    return 0;
  } catch (const NotForUs& error) {
    return Refuse(error.what());
  } catch (const Quorlin::InvalidTokenException& error) {
    // ParseException or InvalidSignatureException: the token itself is no good.
    return Refuse(error.what());
  } catch (const Pelmar::Exception& error) {
    // Not XML, a certificate or a text in it that cannot be read: no good either.
    return Refuse(error.what());
  } catch (Quorlin::ParseException* thrownByPointer) {
    // One kind of broken token is reported by pointer.
    const std::unique_ptr<Quorlin::ParseException> error(thrownByPointer);
    return Refuse(error->what());
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3 && argc != 4) {
    std::cerr << "usage: validateReceivedToken STS.pem AUDIENCE [CLIENT.pem] < token.xml\n";
    return 2;
  }
  try {
    return Run(argc, argv);
  } catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 2;
  }
}
