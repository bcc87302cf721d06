// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Floors.h"
#include "bench/Rows.h"
#include "bench/Tokens.h"

#include "pelmar/crypto/DigestWriter.h"
#include "pelmar/crypto/VerifiedChainCache.h"
#include "pelmar/xml/TrustChainKeyResolver.h"
#include "quorlin/SamlTokenImpl.h"
#include "support/XmlText.h"

#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>

#include <memory>

namespace Bench {

using namespace TestSupport;
using Pelmar::Ref;

namespace {

constexpr double kSmallAim = 2.5;
constexpr double kLargeAim = 3;
constexpr double kValidationLimit = 5;
constexpr unsigned kOtherTrustedCertificates = 50;

Action MakeValidationFloor(const std::string& token) {
  return DoAll({VerifyWithRsa(TokenSigner().keyPair), HashText(token), TokeniseText(token)});
}

Row MakeValidationRow(const std::string& name, const std::string& token, const TrustList& trusted,
                      double aim) {
  const Action validate = [token, trusted] {
    Quorlin::CreateSamlToken(token, trusted);
  };
  return {name, token.size(), validate, MakeValidationFloor(token), kValidationLimit, aim};
}

TrustList TrustManyBesides(const Identity& signer) {
  TrustList trusted;
  for (unsigned i = 0; i < kOtherTrustedCertificates; ++i) {
    CertificateSpec spec;
    spec.commonName = "Other signer " + std::to_string(i);
    trusted.push_back(MakeSelfSigned(spec).certificate);
  }
  trusted.push_back(signer.certificate);
  return trusted;
}

// A token whose signature shows the signer's certificate and its issuer's, of which only the latter is
// trusted.
struct IssuedSignerCase {
  std::string token;
  TrustList trusted;
};

IssuedSignerCase MakeIssuedSignerCase() {
  const Identity root = MakeCa("Benchmark root", 1);
  CertificateSpec spec;
  spec.keyNumber = 2;
  const Identity signer = MakeIssued(root, spec);
  TokenSigning signing;
  signing.alsoShown = {root};
  return {SignToken(ComposeBearerToken(kSmallTokenGroups).Compose(), signer, signing), Trust({root})};
}

// What the memory of verified chains saves: the same with a memory that holds nothing.
Row MakeForgetfulRow(const std::string& token, const TrustList& trusted) {
  const auto cache = std::make_shared<Pelmar::Crypto::VerifiedChainCache>(std::size_t{0});
  const Action validate = [token, trusted, cache] {
    const auto resolver = Pelmar::MakeRef<Pelmar::Xml::Security::TrustChainKeyResolver>(trusted, *cache);
    Quorlin::SamlTokenImpl(token, resolver.Get(), 0);
  };
  constexpr double kLimit = 15;
  return {"the same, not remembering the chain", token.size(), validate, MakeValidationFloor(token), kLimit};
}

// Such a token hands out the holder's certificate, which is read once and then remembered.
Row MakeHolderOfKeyRow(const TrustList& trusted) {
  CertificateSpec spec;
  spec.commonName = "Holder";
  spec.keyNumber = 3;
  const std::string token = SignToken(ComposeHolderOfKeyToken(kSmallTokenGroups, MakeSelfSigned(spec)));
  return MakeValidationRow("5 groups, holder of key", token, trusted, kSmallAim);
}

Row MakeParseRow(const std::string& name, const std::string& token) {
  constexpr double kLimit = 4;
  const Action parse = [token] {
    ParseXmlText(token);
  };
  return {name, token.size(), parse, TokeniseText(token), kLimit};
}

Row MakeCanonicalizationRow(const std::string& name, const std::string& token, const char* algorithm) {
  constexpr double kLimit = 5;
  const Ref<Pelmar::Xml::Document> document = ParseXmlText(token);
  const std::string canonical = CanonicalText(document.Get(), algorithm);
  const Action digest = [document, algorithm] {
    const auto writer = Pelmar::MakeRef<Pelmar::Crypto::DigestWriter>(Pelmar::Crypto::DIGEST_SHA256);
    Pelmar::Xml::Security::CreateCanonicalizer(algorithm)->Canonicalize(document.Get(), writer.Get());
    writer->Finish();
  };
  return {name, canonical.size(), digest, HashText(canonical), kLimit};
}

}  // namespace

Section MakeValidationSection() {
  const TrustList trusted = Trust({TokenSigner()});
  const std::string small = SignToken(ComposeBearerToken(kSmallTokenGroups));
  const std::string medium = SignToken(ComposeBearerToken(kMediumTokenGroups));
  const std::string large = SignToken(ComposeBearerToken(kLargeTokenGroups));
  const IssuedSignerCase issued = MakeIssuedSignerCase();
  return {
      "Validating a token, against one RSA-2048 verification, SHA-256 and tokenising",
      {MakeValidationRow("5 groups", small, trusted, kSmallAim),
       MakeValidationRow("200 groups", medium, trusted, kLargeAim),
       MakeValidationRow("5000 groups", large, trusted, kLargeAim),
       MakeValidationRow("5 groups, 51 trusted certificates", small, TrustManyBesides(TokenSigner()),
                         kSmallAim),
       MakeValidationRow("5 groups, signer below a trusted root", issued.token, issued.trusted, kSmallAim),
       MakeForgetfulRow(issued.token, issued.trusted), MakeHolderOfKeyRow(trusted)}};
}

Section MakeStepsSection() {
  using namespace Pelmar::Xml::Security;
  const std::string small = SignToken(ComposeBearerToken(kSmallTokenGroups));
  const std::string large = SignToken(ComposeBearerToken(kLargeTokenGroups));
  return {"Steps: parsing against tokenising, canonicalising into a digest against the digest",
          {MakeParseRow("5 groups, parse", small), MakeParseRow("5000 groups, parse", large),
           MakeCanonicalizationRow("5 groups, exclusive", small, kExclusiveC14n),
           MakeCanonicalizationRow("5000 groups, exclusive", large, kExclusiveC14n),
           MakeCanonicalizationRow("5000 groups, inclusive", large, kC14n)}};
}

}  // namespace Bench
