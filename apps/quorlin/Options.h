// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Groups of flags that several commands share.

#ifndef QUORLIN_CLI_OPTIONS_H
#define QUORLIN_CLI_OPTIONS_H

#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/TokenSpec.h>

#include <CLI/CLI.hpp>

#include <boost/optional.hpp>

#include <string>
#include <vector>

namespace Cli {

/// A key of the client's own: to sign requests with and to bind tokens to, or for TLS.
struct HolderOfKeyOptions {
  std::string certificateFile;
  std::string key;  ///< A PEM file or a PKCS #11 URI.
  std::string pkcs12File;
  std::string keyPasswordFile;
};

/// Which service, what to trust, and who says so to its TLS.
struct ServiceOptions {
  std::string url;
  std::vector<std::string> caFiles;
  std::vector<std::string> pins;
  std::vector<std::string> stsCertificateFiles;
  HolderOfKeyOptions tlsIdentity;
};

/// Adds --url, --ca, --pin, --sts-cert, --client-cert, --client-key and --client-key-password-file.
void AddServiceOptions(CLI::App& command, ServiceOptions& options);

/// Adds --pin.
void AddPinOption(CLI::App& command, std::vector<std::string>& pins);

/// Adds --cert, --key, --pkcs12 and --key-password-file. The first two are wanted together; these two or
/// --pkcs12 always when `required`. `options` must live as long as `command`.
void AddHolderOfKeyOptions(CLI::App& command, HolderOfKeyOptions& options, bool required);

/// Adds --sts-cert.
void AddStsCertificateOption(CLI::App& command, std::vector<std::string>& files);

/// The key in the PEM file that `options` names as its key. Throws UsageException.
Pelmar::Ref<const Pelmar::Crypto::PrivateKey> ReadPemKey(const HolderOfKeyOptions& options);

/// Reads the files; nothing when none are named. The pass phrase of a PKCS #12 file and the PIN of a token
/// are asked for on the terminal when no file holds them. Throws UsageException.
boost::optional<Quorlin::HolderOfKeyConfig> MakeHolderOfKeyConfig(const HolderOfKeyOptions& options);

/// Reads the files. An https: URL without --ca trusts what the operating system trusts. Throws
/// UsageException, also for what makes no sense without https:.
Quorlin::SecurityTokenServiceConfig MakeServiceConfig(
    const ServiceOptions& options, const HolderOfKeyOptions& holderOfKey = HolderOfKeyOptions());

/// Whether what is sent can be read on the way.
bool IsPlainHttp(const ServiceOptions& options);

/// What the token shall be.
struct TokenOptions {
  long long lifetimeSec = 600;
  bool renewable = false;
  bool delegable = false;
  std::string delegateTo;
  std::vector<std::string> audience;
  std::string adviceFile;
  bool bearer = false;
};

void AddTokenOptions(CLI::App& command, TokenOptions& options);
/// Adds --lifetime alone.
void AddLifetimeOption(CLI::App& command, TokenOptions& options);
/// Adds --bearer, for commands that would otherwise bind the token to the client's key.
void AddBearerOption(CLI::App& command, TokenOptions& options);
/// Reads the advice file. Throws UsageException.
Quorlin::TokenSpec MakeTokenSpec(const TokenOptions& options);

/// Where the outcome goes.
struct OutputOptions {
  std::string file;
  bool json = false;
  /// What a person is told whose credentials are refused; empty: the usual.
  std::string credentialsAdvice;
};

void AddOutputOptions(CLI::App& command, OutputOptions& options);

/// Adds --log, which takes effect at once.
void AddLogOption(CLI::App& command);

/// An option that takes one value each time it is given.
CLI::Option* AddRepeatable(CLI::App& command, const std::string& name, std::vector<std::string>& values,
                           const std::string& description);

}  // namespace Cli

#endif  // QUORLIN_CLI_OPTIONS_H
