// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The client's own key and certificate: from PEM files, a PKCS #11 token or a PKCS #12 file.

#include "quorlin/Failure.h"
#include "quorlin/Files.h"
#include "quorlin/Options.h"
#include "quorlin/Password.h"
#include "quorlin/Terminal.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/Pkcs11.h>
#include <pelmar/crypto/Pkcs12.h>

namespace Cli {

namespace {

using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::Crypto::PrivateKey;

Secret ReadOrAsk(const HolderOfKeyOptions& options, const std::string& name, const std::string& what) {
  return options.keyPasswordFile.empty() ? AskOnTerminal(name, "there is no terminal to ask for the " + what +
                                                                   ": use --key-password-file")
                                         : ReadSecretFile(options.keyPasswordFile);
}

// The URI is not repeated in messages: what is wrong with it may be a PIN.
Ref<const PrivateKey> OpenTokenKey(const HolderOfKeyOptions& options,
                                   const Ref<const Certificate>& certificate) {
  const auto askPin = [&options] {
    return ReadOrAsk(options, "PIN of the token of --key", "PIN").Reveal();
  };
  try {
    return Pelmar::Crypto::CreatePrivateKeyFromPkcs11(options.key, certificate, askPin);
  } catch (const Pelmar::Exception& e) {
    throw UsageException(std::string("cannot use the key of --key: ") + e.what());
  }
}

Quorlin::HolderOfKeyConfig ReadPkcs12File(const HolderOfKeyOptions& options) {
  const Secret content(ReadFile(options.pkcs12File));
  const std::string& bytes = content.Reveal();
  const Secret passPhrase =
      ReadOrAsk(options, "Pass phrase of " + MakePrintable(options.pkcs12File), "pass phrase");
  try {
    const Pelmar::Crypto::Pkcs12Content file = Pelmar::Crypto::ReadPkcs12(
        std::vector<unsigned char>(bytes.begin(), bytes.end()), passPhrase.Reveal());
    return Quorlin::HolderOfKeyConfig{file.privateKey, file.certificate};
  } catch (const Pelmar::Exception& e) {
    throw UsageException("cannot use " + options.pkcs12File + ": " + e.what());
  }
}

void RequireIdentity(const HolderOfKeyOptions& options, bool required) {
  const bool isGiven = !options.key.empty() || !options.pkcs12File.empty();
  if (required && !isGiven) {
    throw CLI::RequiredError("--cert or --pkcs12");
  }
  if (!options.keyPasswordFile.empty() && !isGiven) {
    throw CLI::RequiresError("--key-password-file", "--key or --pkcs12");
  }
}

}  // namespace

void AddHolderOfKeyOptions(CLI::App& command, HolderOfKeyOptions& options, bool required) {
  const std::string needed = required ? "; needed unless --pkcs12 is given" : "";
  CLI::Option* const certificate =
      command.add_option("--cert", options.certificateFile, "Your certificate" + needed)->type_name("PEM");
  CLI::Option* const key =
      command
          .add_option(
              "--key", options.key,
              "Its private key, which signs the request: a PEM file, or a pkcs11: URI (RFC 7512) that names a "
              "key in a token")
          ->type_name("FILE|URI");
  certificate->needs(key);
  key->needs(certificate);
  command
      .add_option("--pkcs12", options.pkcs12File,
                  "Your certificate and its private key in a PKCS #12 file, instead of --cert and --key")
      ->excludes(certificate)
      ->excludes(key)
      ->type_name("FILE");
  command
      .add_option(
          "--key-password-file", options.keyPasswordFile,
          "The pass phrase of an encrypted --key or of --pkcs12, or the PIN of a token; without it, that of "
          "--pkcs12 and the PIN are asked for on the terminal")
      ->type_name("FILE");
  command.parse_complete_callback([&options, required] { RequireIdentity(options, required); });
}

Ref<const PrivateKey> ReadPemKey(const HolderOfKeyOptions& options) {
  const Secret pem = ReadKeyFile(options.key);
  try {
    if (options.keyPasswordFile.empty()) {
      return Pelmar::Crypto::CreatePrivateKeyFromPem(pem.Reveal());
    }
    return Pelmar::Crypto::CreatePrivateKeyFromPem(pem.Reveal(),
                                                   ReadSecretFile(options.keyPasswordFile).Reveal());
  } catch (const Pelmar::Exception& e) {
    throw UsageException("cannot use the key in " + options.key + ": " + e.what());
  }
}

boost::optional<Quorlin::HolderOfKeyConfig> MakeHolderOfKeyConfig(const HolderOfKeyOptions& options) {
  if (!options.pkcs12File.empty()) {
    return ReadPkcs12File(options);
  }
  if (options.key.empty()) {
    return boost::none;
  }
  Quorlin::HolderOfKeyConfig identity;
  if (!Pelmar::Crypto::IsPkcs11Uri(options.key)) {
    identity.privateKey = ReadPemKey(options);
    identity.certificate = ReadCertificates({options.certificateFile}).front();
    return identity;
  }
  identity.certificate = ReadCertificates({options.certificateFile}).front();
  identity.privateKey = OpenTokenKey(options, identity.certificate);
  return identity;
}

}  // namespace Cli
