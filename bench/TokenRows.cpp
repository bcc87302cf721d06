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

#include <iterator>
#include <memory>

namespace Bench {

using namespace TestSupport;
using Pelmar::Ref;

namespace {

constexpr double kSmallAim = 1.5;
constexpr double kMediumAim = 1.8;
constexpr double kLargeAim = 2;
constexpr double kHolderAim = 2.5;
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

Row MakeValidationRow(const SampleToken& token, double aim) {
  return MakeValidationRow(token.name, token.text, token.trusted, aim);
}

/// The next floor: the same without a tokeniser.
Contender MakeCryptographyAlone(const std::string& token) {
  return MakeContender("RSA-2048 and SHA-256 alone",
                       DoAll({VerifyWithRsa(TokenSigner().keyPair), HashText(token)}));
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
  return MakeValidationRow("5 groups, holder of key", token, trusted, kHolderAim);
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

Section MakeValidationSection(const PeerSet& peers) {
  const SampleTokens& tokens = GetSampleTokens();
  Section section{"Validating a token, against one RSA-2048 verification, SHA-256 and tokenising",
                  {MakeValidationRow(tokens.small, kSmallAim), MakeValidationRow(tokens.medium, kMediumAim),
                   MakeValidationRow(tokens.large, kLargeAim), MakeValidationRow(tokens.huge, kLargeAim),
                   MakeValidationRow(tokens.issued, kSmallAim),
                   MakeForgetfulRow(tokens.issued.text, tokens.issued.trusted),
                   MakeValidationRow("5 groups, 51 trusted certificates", tokens.small.text,
                                     TrustManyBesides(TokenSigner()), kSmallAim),
                   MakeHolderOfKeyRow(tokens.small.trusted)}};
  const SampleToken* const compared[] = {&tokens.small, &tokens.medium, &tokens.large, &tokens.huge,
                                         &tokens.issued};
  for (std::size_t i = 0; i < std::size(compared); ++i) {
    section.rows[i].others = peers.GetContenders(*compared[i]);
    section.rows[i].others.insert(section.rows[i].others.begin(), MakeCryptographyAlone(compared[i]->text));
  }
  return section;
}

Section MakeStepsSection() {
  using namespace Pelmar::Xml::Security;
  const std::string& small = GetSampleTokens().small.text;
  const std::string& large = GetSampleTokens().large.text;
  return {"Steps: parsing against tokenising, canonicalising into a digest against the digest",
          {MakeParseRow("5 groups, parse", small), MakeParseRow("5000 groups, parse", large),
           MakeCanonicalizationRow("5 groups, exclusive", small, kExclusiveC14n),
           MakeCanonicalizationRow("5000 groups, exclusive", large, kExclusiveC14n),
           MakeCanonicalizationRow("5000 groups, inclusive", large, kC14n)}};
}

}  // namespace Bench
