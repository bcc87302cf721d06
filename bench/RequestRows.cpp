// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Floors.h"
#include "bench/Rows.h"
#include "bench/Tokens.h"

#include "quorlin/Namespaces.h"
#include "quorlin/RequestBuilderImpl.h"
#include "support/XmlText.h"

#include <pelmar/xml/security/Algorithms.h>

#include <memory>

namespace Bench {

using namespace TestSupport;
using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using Quorlin::Request;
using Quorlin::RequestBuilderImpl;
using Quorlin::TokenSpec;

namespace {

constexpr double kSignedAim = 1.08;
constexpr double kSignedLimit = 2;
constexpr double kUnsignedAimMicroseconds = 40;
constexpr double kUnsignedLimit = 4;
constexpr std::size_t kLegBytes = 2048;  // Of the negotiation; a Kerberos ticket is about as long.

using Build = std::function<void(const RequestBuilderImpl& builder, Request& request)>;

const Identity& Client() {
  static const Identity client = [] {
    CertificateSpec spec;
    spec.commonName = "Client";
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }();
  return client;
}

std::shared_ptr<const RequestBuilderImpl> MakeBuilder(bool withKey) {
  boost::optional<Quorlin::HolderOfKeyConfig> config;
  if (withKey) {
    config = Quorlin::HolderOfKeyConfig{Client().GetKey(), Client().certificate};
  }
  return std::make_shared<const RequestBuilderImpl>(config);
}

TokenSpec MakeSpec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  spec.delegable = true;
  spec.renewable = true;
  return spec;
}

boost::shared_ptr<Quorlin::SamlToken> MakeToken() {
  return ReadToken(ComposeHolderOfKeyToken(kSmallTokenGroups, Client()));
}

std::string CanonicalFormOf(const ElementNode* element) {
  return CanonicalText(element, Pelmar::Xml::Security::kExclusiveC14n);
}

Action MakeSigningFloor(const std::string& envelope) {
  const Ref<Pelmar::Xml::Document> document = ParseXmlText(envelope);
  const ElementNode* const root = document->GetDocumentElement();
  const ElementNode* const security =
      root->FindChildElement(Quorlin::kSoapEnv, "Header")->FindChildElement(Quorlin::kWsse, "Security");
  return DoAll({SignWithRsa(Client().keyPair),
                HashText(CanonicalFormOf(root->FindChildElement(Quorlin::kSoapEnv, "Body"))),
                HashText(CanonicalFormOf(security->FindChildElement(Quorlin::kWsu, "Timestamp")))});
}

Row MakeRow(const std::string& name, bool isSigned, const Build& build) {
  const std::shared_ptr<const RequestBuilderImpl> builder = MakeBuilder(isSigned);
  Request example;
  build(*builder, example);
  const Action subject = [builder, build] {
    Request request;
    build(*builder, request);
  };
  if (isSigned) {
    return {name, example.body.size(), subject, MakeSigningFloor(example.body), kSignedLimit, kSignedAim};
  }
  return {name, example.body.size(),     subject, TokeniseText(example.body), kUnsignedLimit,
          0,    kUnsignedAimMicroseconds};
}

Build ByPassword() {
  return [spec = MakeSpec()](const RequestBuilderImpl& builder, Request& request) {
    builder.BuildUserPassTokenRequest("alice@example.com", "open sesame", spec, request);
  };
}

Build ByNegotiation() {
  return [spec = MakeSpec(), leg = std::vector<unsigned char>(kLegBytes, 0x5A)](
             const RequestBuilderImpl& builder, Request& request) {
    builder.BuildInitialSPNegoRequest(spec, leg, request);
  };
}

}  // namespace

Section MakeSignedRequestsSection() {
  const auto token = MakeToken();
  const TokenSpec spec = MakeSpec();
  return {"Signed requests, against one RSA-2048 signature and SHA-256 of the two signed elements",
          {MakeRow("issue by password", true, ByPassword()),
           MakeRow("issue by negotiation, first leg", true, ByNegotiation()),
           MakeRow("issue by certificate", true,
                   [spec](const RequestBuilderImpl& builder, Request& request) {
                     builder.BuildCertificateTokenRequest(spec, request);
                   }),
           MakeRow("exchange of a token", true,
                   [token, spec](const RequestBuilderImpl& builder, Request& request) {
                     builder.BuildExchangeTokenRequest(*token, spec, request);
                   }),
           MakeRow("renewal of a token", true, [token](const RequestBuilderImpl& builder, Request& request) {
             builder.BuildRenewRequest(*token, 3600, request);
           })}};
}

Section MakeUnsignedRequestsSection() {
  const auto token = MakeToken();
  return {
      "Unsigned requests, against tokenising their text",
      {MakeRow("issue by password", false, ByPassword()),
       MakeRow("issue by negotiation, first leg", false, ByNegotiation()),
       MakeRow("issue by negotiation, further leg", false,
               [leg = std::vector<unsigned char>(kLegBytes, 0x5A)](const RequestBuilderImpl& builder,
                                                                   Request& request) {
                 builder.BuildContinuedSPNegoRequest("urn:uuid:5", leg, request);
               }),
       MakeRow("validation of a token", false, [token](const RequestBuilderImpl& builder, Request& request) {
         builder.BuildValidateSubjectRequest(*token, request);
       })}};
}

}  // namespace Bench
