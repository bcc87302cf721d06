// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Options.h"

#include "quorlin/AdviceFile.h"
#include "quorlin/Failure.h"
#include "quorlin/Files.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/service/Logger.h>

namespace Cli {

namespace {

bool HasScheme(const std::string& url, const std::string& scheme) {
  return Pelmar::StringUtil::ToLower(url.substr(0, scheme.size())) == scheme;
}

Pelmar::Ref<Pelmar::Ssl::SSLContext> MakeSslContext(const ServiceOptions& options) {
  Pelmar::Ssl::SSLContextOptions contextOptions;
  contextOptions.trustAnchors = ReadCertificates(options.caFiles);
  contextOptions.useSystemStore = options.caFiles.empty();
  if (!options.tlsIdentity.key.empty()) {
    contextOptions.clientKey = ReadPemKey(options.tlsIdentity);
    // The first is the client's own; others stand between it and an authority.
    contextOptions.clientCertificateChain = ReadCertificates({options.tlsIdentity.certificateFile});
    contextOptions.clientCertificate = contextOptions.clientCertificateChain.front();
    contextOptions.clientCertificateChain.pop_front();
  }
  try {
    return Pelmar::Ssl::CreateSSLContext(contextOptions);
  } catch (const Pelmar::Crypto::CryptoException& e) {
    throw UsageException(std::string("cannot set up TLS: ") + e.what());
  }
}

/// The pins as the library wants them.
std::string Join(const std::vector<std::string>& pins) {
  std::string all;
  for (const std::string& pin : pins) {
    all += (all.empty() ? "" : ";") + pin;
  }
  return all;
}

void AddTlsIdentityOptions(CLI::App& command, HolderOfKeyOptions& options) {
  CLI::Option* const certificate =
      command
          .add_option("--client-cert", options.certificateFile,
                      "Your certificate for TLS, perhaps followed by those of its issuers")
          ->type_name("PEM");
  CLI::Option* const key =
      command.add_option("--client-key", options.key, "Its private key")->type_name("PEM");
  certificate->needs(key);
  key->needs(certificate);
  command
      .add_option("--client-key-password-file", options.keyPasswordFile,
                  "The pass phrase of an encrypted --client-key")
      ->needs(key)
      ->type_name("FILE");
}

}  // namespace

CLI::Option* AddRepeatable(CLI::App& command, const std::string& name, std::vector<std::string>& values,
                           const std::string& description) {
  // Without this, "--ca a.pem token.xml" would take both.
  return command.add_option(name, values, description)->allow_extra_args(false)->type_size(1);
}

void AddServiceOptions(CLI::App& command, ServiceOptions& options) {
  command.add_option("--url", options.url, "The token service, http: or https:")
      ->required()
      ->type_name("URL");
  AddRepeatable(
      command, "--ca", options.caFiles,
      "Trust the TLS servers of these authorities; without it, those the system trusts. May be repeated")
      ->type_name("PEM");
  AddPinOption(command, options.pins);
  AddStsCertificateOption(command, options.stsCertificateFiles);
  AddTlsIdentityOptions(command, options.tlsIdentity);
}

void AddPinOption(CLI::App& command, std::vector<std::string>& pins) {
  AddRepeatable(
      command, "--pin", pins,
      "Demand that the TLS server's key is this one, or one of these: sha256// and the base64 SHA-256 of the "
      "public key. May be repeated")
      ->type_name("PIN");
}

void AddStsCertificateOption(CLI::App& command, std::vector<std::string>& files) {
  AddRepeatable(command, "--sts-cert", files,
                "Accept tokens signed with these certificates or by their authorities. May be repeated")
      ->required()
      ->type_name("PEM");
}

Quorlin::SecurityTokenServiceConfig MakeServiceConfig(const ServiceOptions& options,
                                                      const HolderOfKeyOptions& holderOfKey) {
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = options.url;
  config.trustedStsCertificates = ReadCertificates(options.stsCertificateFiles);
  if (!IsPlainHttp(options)) {
    config.sslContext = MakeSslContext(options);
    config.sslConnectionParam = Join(options.pins);
  } else if (!options.pins.empty()) {
    throw UsageException("--pin needs an https: URL");
  } else if (!options.tlsIdentity.key.empty()) {
    throw UsageException("--client-cert needs an https: URL");
  }
  config.holderOfKeyConfig = MakeHolderOfKeyConfig(holderOfKey);
  return config;
}

bool IsPlainHttp(const ServiceOptions& options) {
  return HasScheme(options.url, "http:");
}

void AddLifetimeOption(CLI::App& command, TokenOptions& options) {
  command.add_option("--lifetime", options.lifetimeSec, "How long the token shall be valid, in seconds")
      ->type_name("SEC")
      ->capture_default_str();
}

void AddBearerOption(CLI::App& command, TokenOptions& options) {
  command.add_flag("--bearer", options.bearer, "Ask for a token that is not bound to your key");
}

void AddTokenOptions(CLI::App& command, TokenOptions& options) {
  AddLifetimeOption(command, options);
  command.add_flag("--renewable", options.renewable, "Ask for a token that can be renewed");
  command.add_flag("--delegable", options.delegable, "Ask for a token that can be delegated further");
  command
      .add_option("--delegate-to", options.delegateTo, "Ask for a token with which NAME may act for the user")
      ->type_name("NAME");
  AddRepeatable(command, "--audience", options.audience,
                "Restrict the token to this service. May be repeated")
      ->type_name("URI");
  command
      .add_option("--advice", options.adviceFile,
                  "Ask for this advice in the token: JSON, as --json prints it")
      ->type_name("FILE");
}

Quorlin::TokenSpec MakeTokenSpec(const TokenOptions& options) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = options.lifetimeSec;
  spec.renewable = options.renewable;
  spec.delegable = options.delegable;
  if (!options.delegateTo.empty()) {
    spec.delegateTo = options.delegateTo;
  }
  spec.audienceRestriction.insert(options.audience.begin(), options.audience.end());
  if (!options.adviceFile.empty()) {
    spec.advice = ReadAdvice(options.adviceFile);
  }
  if (options.bearer) {
    spec.confirmation = Quorlin::TokenSpec::CONFIRMATION_BEARER;
  }
  return spec;
}

void AddOutputOptions(CLI::App& command, OutputOptions& options) {
  command.add_option("--out", options.file, "Write the token's XML to this file, which only you may read")
      ->type_name("FILE");
  command.add_flag("--json", options.json, "Print one JSON object instead of a summary");
}

void AddLogOption(CLI::App& command) {
  // The platform's own sink writes to standard error and escapes what could steer a terminal.
  const auto enable = [](std::int64_t) {
    Pelmar::Service::GetApp()->GetLogManager()->SetEnabledLevels(Pelmar::Service::kAllLogLevels);
  };
  command.add_flag_function("--log", enable, "Show the library's log lines on standard error");
}

}  // namespace Cli
