// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "interop/hsm/SoftHsm.h"

#include "support/Process.h"

#include <pelmar/crypto/Digest.h>

#include <openssl/evp.h>
#include <openssl/x509.h>

#include <cstdlib>
#include <filesystem>
#include <memory>
#include <stdexcept>
#include <system_error>

namespace HsmTests {

namespace {

using TestSupport::ProcessResult;

/// Runs a program that has to succeed.
std::string Run(const std::vector<std::string>& command, const std::string& package) {
  ProcessResult result;
  try {
    result = TestSupport::RunProcess(command);
  } catch (const std::system_error& error) {
    throw std::runtime_error(std::string(error.what()) + " (it comes with the Debian package " + package +
                             ")");
  }
  if (result.exitCode != 0) {
    throw std::runtime_error(command[0] + " failed: " + result.standardOutput + result.standardError);
  }
  return result.standardOutput;
}

std::string FindModule() {
  const char* const places[] = {"/usr/lib/softhsm/libsofthsm2.so", "/usr/lib64/softhsm/libsofthsm2.so",
                                "/usr/lib64/pkcs11/libsofthsm2.so", "/usr/local/lib/softhsm/libsofthsm2.so"};
  for (const char* const place : places) {
    if (std::filesystem::exists(place)) {
      return place;
    }
  }
  throw std::runtime_error("libsofthsm2.so was not found (it comes with the Debian package softhsm2)");
}

void MakeToken(const std::string& label, const std::string& pin) {
  Run({"softhsm2-util", "--init-token", "--free", "--label", label, "--pin", pin, "--so-pin", "officer"},
      "softhsm2");
}

const char* PinOf(const std::string& token) {
  return token == "second" ? kSecondPin : kPin;
}

std::string ToHex(const std::string& text) {
  return Pelmar::Crypto::ToHex(std::vector<unsigned char>(text.begin(), text.end()));
}

std::shared_ptr<evp_pkey_st> ReadPublicKey(const std::string& der) {
  const auto* position = reinterpret_cast<const unsigned char*>(der.data());
  EVP_PKEY* const key = d2i_PUBKEY(nullptr, &position, static_cast<long>(der.size()));
  if (key == nullptr) {
    throw std::runtime_error("the public key of a token cannot be read");
  }
  return std::shared_ptr<evp_pkey_st>(key, EVP_PKEY_free);
}

}  // namespace

const SoftHsm& SoftHsm::Shared() {
  // Never destroyed: the module may still write to its directory when the process ends. The directory itself
  // is removed before that, by the handler.
  static const SoftHsm* const hsm = [] {
    static const SoftHsm* made = nullptr;
    made = new SoftHsm();
    std::atexit([] {
      std::error_code ignored;
      std::filesystem::remove_all(made->_files.GetPath(), ignored);
    });
    return made;
  }();
  return *hsm;
}

SoftHsm::SoftHsm() : _module(FindModule()), _authority(TestSupport::MakeCa("HSM users", 5)) {
  std::filesystem::create_directory(_files.GetPath("tokens"));
  const std::string configuration =
      _files.WriteFile("softhsm2.conf", "directories.tokendir = " + _files.GetPath("tokens") +
                                            "\nobjectstore.backend = file\n");
  setenv("SOFTHSM2_CONF", configuration.c_str(), 1);
  MakeToken("quorlin test", kPin);
  MakeToken("guarded", kPin);
  MakeToken("second", kSecondPin);
}

std::string SoftHsm::RunTool(const std::string& token, const std::vector<std::string>& arguments) const {
  std::vector<std::string> command = {"pkcs11-tool", "--module", _module, "--token-label",
                                      token,         "--login",  "--pin", PinOf(token)};
  command.insert(command.end(), arguments.begin(), arguments.end());
  return Run(command, "opensc");
}

TokenKey SoftHsm::MakeKey(const std::string& label, const std::string& kind, const std::string& token,
                          const std::vector<std::string>& more) const {
  std::vector<std::string> arguments = {"--keypairgen", "--key-type", kind,        "--label",
                                        label,          "--id",       ToHex(label)};
  arguments.insert(arguments.end(), more.begin(), more.end());
  RunTool(token, arguments);
  RunTool(token, {"--read-object", "--type", "pubkey", "--label", label, "--output-file",
                  _files.GetPath(label + ".der")});
  TestSupport::CertificateSpec spec;
  spec.commonName = label;
  spec.key = ReadPublicKey(_files.ReadFile(label + ".der"));
  return {label, TestSupport::MakeIssued(_authority, spec).certificate};
}

std::string SoftHsm::MakeUri(const std::string& label, const std::string& token) const {
  return "pkcs11:token=" + token + ";object=" + label + "?module-path=" + _module;
}

}  // namespace HsmTests
