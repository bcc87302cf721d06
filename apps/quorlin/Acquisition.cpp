// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Acquisition.h"

#include <pelmar/http/Url.h>
#include <quorlin/SecurityTokenService.h>

#include <iostream>

namespace Cli {

namespace {

using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

KerberosOptions MakeKerberosOptions(const Acquisition& acquisition) {
  KerberosOptions options = acquisition.kerberos;
  if (options.target.empty()) {
    options.target = "HTTP@" + Pelmar::Http::ParseHttpURL(acquisition.service.url).host;
  }
  return options;
}

}  // namespace

void AddKerberosOptions(CLI::App& command, KerberosOptions& options) {
  command
      .add_option("--target", options.target,
                  "The Kerberos service to negotiate with; without it, HTTP@ and the host of --url")
      ->type_name("SERVICE@HOST");
  command
      .add_option("--principal", options.principal,
                  "Act as this Kerberos principal; without it, as the one your ticket is for")
      ->type_name("NAME");
  command.add_option("--ccache", options.cache, "Take the ticket from this credential cache")
      ->type_name("NAME");
}

TokenPointer AcquireByPassword(const Acquisition& acquisition) {
  // Everything that can be wrong with the arguments comes before the question for the password.
  const ServiceCall call(MakeServiceConfig(acquisition.service, acquisition.holderOfKey), acquisition.call);
  const Quorlin::TokenSpec spec = MakeTokenSpec(acquisition.token);
  if (IsPlainHttp(acquisition.service)) {
    std::cerr << "quorlin: warning: with an http: URL the password can be read on its way\n";
  }
  const Secret password = ReadPassword(acquisition.password, acquisition.userName);
  return call.Run([&](const Quorlin::SecurityTokenService& service) {
    return service.AcquireToken(acquisition.userName, password.Reveal(), spec);
  });
}

TokenPointer AcquireByCertificate(const Acquisition& acquisition) {
  const Quorlin::TokenSpec spec = MakeTokenSpec(acquisition.token);
  const ServiceCall call(MakeServiceConfig(acquisition.service, acquisition.holderOfKey), acquisition.call);
  return call.Run(
      [&](const Quorlin::SecurityTokenService& service) { return service.AcquireTokenByCertificate(spec); });
}

TokenPointer AcquireByGss(const Acquisition& acquisition) {
  RequireKerberos();
  const ServiceCall call(MakeServiceConfig(acquisition.service, acquisition.holderOfKey), acquisition.call);
  const Quorlin::TokenSpec spec = MakeTokenSpec(acquisition.token);
  const KerberosOptions kerberos = MakeKerberosOptions(acquisition);
  return call.Run([&](const Quorlin::SecurityTokenService& service) {
    return AcquireByKerberos(service, spec, kerberos);
  });
}

}  // namespace Cli
