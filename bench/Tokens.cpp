// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Tokens.h"

#include "quorlin/Namespaces.h"

namespace Bench {

using namespace TestSupport;

namespace {

std::vector<std::string> MakeGroups(std::size_t count) {
  std::vector<std::string> groups;
  for (std::size_t i = 0; i < count; ++i) {
    groups.push_back("example.com\\Engineering-Site-" + std::to_string(i) + "-Operators");
  }
  return groups;
}

SampleToken MakeDirect(const std::string& name, std::size_t groups) {
  return {name, SignToken(ComposeBearerToken(groups)), Trust({TokenSigner()}), groups};
}

SampleToken MakeIssuedSample() {
  const Identity root = MakeCa("Benchmark root", 1);
  CertificateSpec spec;
  spec.keyNumber = 2;
  const Identity signer = MakeIssued(root, spec);
  TokenSigning signing;
  signing.alsoShown = {root};
  return {"5 groups, signer below a trusted root",
          SignToken(ComposeBearerToken(kSmallTokenGroups).Compose(), signer, signing), Trust({root}),
          kSmallTokenGroups};
}

}  // namespace

TokenText ComposeBearerToken(std::size_t groups) {
  TokenText text;
  text.restrictions =
      "<saml:AudienceRestriction><saml:Audience>https://inventory.example/</saml:Audience>"
      "</saml:AudienceRestriction>" +
      ProxyRestriction("Count=\"10\"") + RenewRestriction("Count=\"10\"");
  text.attributes = AttributeElement(Quorlin::kAttrGroupIdentity, MakeGroups(groups)) +
                    AttributeElement(Quorlin::kClaimGivenName, {"Alice"}) +
                    AttributeElement(Quorlin::kClaimSurname, {"Liddell"}) +
                    AttributeElement(Quorlin::kAttrIsSolution, {"false"});
  return text;
}

TokenText ComposeHolderOfKeyToken(std::size_t groups, const Identity& holder) {
  TokenText text = ComposeBearerToken(groups);
  text.HoldKey(holder);
  return text;
}

const SampleTokens& GetSampleTokens() {
  static const SampleTokens tokens = {MakeDirect("5 groups", kSmallTokenGroups),
                                      MakeDirect("200 groups", kMediumTokenGroups),
                                      MakeDirect("5000 groups", kLargeTokenGroups),
                                      MakeDirect("50000 groups", kHugeTokenGroups), MakeIssuedSample()};
  return tokens;
}

}  // namespace Bench
