// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/RequestBuilderImpl.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Exceptions.h>

#include <boost/make_shared.hpp>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <cstddef>
#include <functional>
#include <future>
#include <limits>
#include <string>
#include <vector>

#include "quorlin/xmlSoapBuilders.h"
#include "support/FakeSamlToken.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/VirtualSlot.h"

namespace Quorlin {
namespace {

using testing::Eq;
using testing::KilledBySignal;
using TestSupport::CutBetween;
using TestSupport::FakeSamlToken;
using TestSupport::MaskVolatile;
using TestSupport::ReadGoldenText;
using TestSupport::ReplaceAll;
using TestSupport::SlotOf;

constexpr TokenSpec::Confirmation kDefault = TokenSpec::CONFIRMATION_DEFAULT;
constexpr TokenSpec::Confirmation kBearer = TokenSpec::CONFIRMATION_BEARER;

const char* const kUserName = "alice@example.com";
const char* const kPassword = "correct horse";
const std::vector<unsigned char> kLeg = {0x60, 0x01, 0xFF};

// One identity for all tests: making keys takes time.
const HolderOfKeyConfig& Identity() {
  static const HolderOfKeyConfig config = [] {
    const TestSupport::Identity identity = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
    HolderOfKeyConfig made;
    made.privateKey = identity.GetKey();
    made.certificate = identity.certificate;
    return made;
  }();
  return config;
}

RequestBuilderImpl WithoutKey() {
  return RequestBuilderImpl(boost::none);
}

RequestBuilderImpl WithKey() {
  return RequestBuilderImpl(Identity());
}

std::string Masked(const std::string& body) {
  const std::string certificate = Pelmar::StringUtil::Base64Encode(Identity().certificate->GetDer());
  return MaskVolatile(ReplaceAll(body, certificate, "{certificate}"));
}

// --- The specs of the golden requests ---

TokenSpec Spec(TokenSpec::Confirmation confirmation = kDefault) {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  spec.confirmation = confirmation;
  return spec;
}

TokenSpec WithAudience(TokenSpec spec) {
  spec.audienceRestriction = {"https://b.example/", "https://a.example/"};
  return spec;
}

TokenSpec WithAdvice(TokenSpec spec) {
  spec.advice = {Advice{"https://app.example/", {{"role", {"admin", "user"}}, {"empty", {}}}},
                 Advice{"urn:other", {}}};
  return spec;
}

TokenSpec WithDelegate(TokenSpec spec) {
  spec.delegateTo = std::string("bob@example.com");
  return spec;
}

TokenSpec WithFlags(TokenSpec spec, bool renewable, bool delegable) {
  spec.renewable = renewable;
  spec.delegable = delegable;
  return spec;
}

TokenSpec FullSpec(TokenSpec::Confirmation confirmation = kDefault) {
  return WithFlags(WithDelegate(WithAudience(WithAdvice(Spec(confirmation)))), true, true);
}

// --- Golden requests ---

using BuildRequest = std::function<void(Request&)>;

BuildRequest Password(const RequestBuilderImpl& builder, const TokenSpec& spec) {
  return [=](Request& request) {
    builder.BuildUserPassTokenRequest(kUserName, kPassword, spec, request);
  };
}

BuildRequest InitialSpnego(const RequestBuilderImpl& builder, const TokenSpec& spec) {
  return [=](Request& request) {
    builder.BuildInitialSPNegoRequest(spec, kLeg, request);
  };
}

BuildRequest ContinuedSpnego(const RequestBuilderImpl& builder, const std::vector<unsigned char>& leg) {
  return [=](Request& request) {
    builder.BuildContinuedSPNegoRequest("urn:context:7", leg, request);
  };
}

BuildRequest Certificate(const RequestBuilderImpl& builder, const TokenSpec& spec) {
  return [=](Request& request) {
    builder.BuildCertificateTokenRequest(spec, request);
  };
}

BuildRequest Exchange(const RequestBuilderImpl& builder, SamlToken::ConfirmationType type,
                      const TokenSpec& spec) {
  return [=](Request& request) {
    builder.BuildExchangeTokenRequest(FakeSamlToken(type), spec, request);
  };
}

BuildRequest Validate(const RequestBuilderImpl& builder, SamlToken::ConfirmationType type) {
  return [=](Request& request) {
    builder.BuildValidateSubjectRequest(FakeSamlToken(type), request);
  };
}

BuildRequest Renew(const RequestBuilderImpl& builder, long long lifetimeSec) {
  return [=](Request& request) {
    builder.BuildRenewRequest(FakeSamlToken(), lifetimeSec, request);
  };
}

struct GoldenCase {
  const char* description;
  BuildRequest build;
  const char* action;
  const char* file;
};

const char* const kIssueUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
const char* const kRenewUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew";
const char* const kValidateUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate";
const char* const kChallengeUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";

void ExpectGolden(const std::vector<GoldenCase>& cases) {
  for (const GoldenCase& c : cases) {
    Request request;
    c.build(request);
    EXPECT_EQ(request.soapAction, c.action) << c.description;
    EXPECT_EQ(Masked(request.body), ReadGoldenText(std::string("requests/") + c.file)) << c.description;
  }
}

TEST(RequestBuilder, BuildsIssueByPassword) {
  const TokenSpec extras = WithFlags(WithAudience(WithAdvice(Spec())), true, true);
  const TokenSpec delegated = WithFlags(WithDelegate(Spec()), false, true);
  ExpectGolden({
      {"no key", Password(WithoutKey(), Spec()), kIssueUri, "password-bearer.xml"},
      {"no key, bearer", Password(WithoutKey(), Spec(kBearer)), kIssueUri, "password-bearer.xml"},
      {"no key, full", Password(WithoutKey(), FullSpec()), kIssueUri, "password-bearer-full.xml"},
      {"key", Password(WithKey(), Spec()), kIssueUri, "password-holder-of-key.xml"},
      {"key, extras", Password(WithKey(), extras), kIssueUri, "password-holder-of-key-audience-advice.xml"},
      // The body asks for a holder-of-key token, and nobody signs.
      {"key, delegate", Password(WithKey(), delegated), kIssueUri, "password-holder-of-key-delegate.xml"},
      {"key, bearer", Password(WithKey(), Spec(kBearer)), kIssueUri, "password-bearer.xml"},
      {"key, bearer, full", Password(WithKey(), FullSpec(kBearer)), kIssueUri, "password-bearer-full.xml"},
  });
}

TEST(RequestBuilder, BuildsTheFirstSpnegoLeg) {
  const TokenSpec delegated = WithFlags(WithDelegate(Spec()), false, true);
  ExpectGolden({
      {"no key", InitialSpnego(WithoutKey(), Spec()), kIssueUri, "spnego-initial-bearer.xml"},
      {"no key, full", InitialSpnego(WithoutKey(), FullSpec()), kIssueUri, "spnego-initial-bearer-full.xml"},
      {"key", InitialSpnego(WithKey(), Spec()), kIssueUri, "spnego-initial-holder-of-key.xml"},
      {"key, delegate", InitialSpnego(WithKey(), delegated), kIssueUri,
       "spnego-initial-holder-of-key-delegate.xml"},
      {"key, bearer", InitialSpnego(WithKey(), Spec(kBearer)), kIssueUri, "spnego-initial-bearer.xml"},
  });
}

TEST(RequestBuilder, BuildsFurtherSpnegoLegsAsResponses) {
  ExpectGolden({
      {"no key", ContinuedSpnego(WithoutKey(), kLeg), kChallengeUri, "spnego-continued.xml"},
      {"key", ContinuedSpnego(WithKey(), kLeg), kChallengeUri, "spnego-continued.xml"},
      {"empty leg", ContinuedSpnego(WithoutKey(), {}), kChallengeUri, "spnego-continued-empty-leg.xml"},
  });
}

TEST(RequestBuilder, BuildsIssueByCertificate) {
  const TokenSpec extras = WithFlags(WithAudience(WithAdvice(Spec())), true, false);
  ExpectGolden({
      {"plain", Certificate(WithKey(), Spec()), kIssueUri, "certificate.xml"},
      {"extras", Certificate(WithKey(), extras), kIssueUri, "certificate-audience-advice.xml"},
      // Signed for a delegate too, but without naming the signature as proof.
      {"full", Certificate(WithKey(), FullSpec()), kIssueUri, "certificate-full.xml"},
  });
}

TEST(RequestBuilder, BuildsIssueByToken) {
  constexpr SamlToken::ConfirmationType bearer = SamlToken::CONFIRM_BEARER;
  constexpr SamlToken::ConfirmationType holderOfKey = SamlToken::CONFIRM_HOLDER_OF_KEY;
  ExpectGolden({
      {"plain", Exchange(WithKey(), holderOfKey, Spec()), kIssueUri, "exchange-holder-of-key.xml"},
      {"of a bearer token", Exchange(WithKey(), bearer, Spec()), kIssueUri, "exchange-holder-of-key.xml"},
      {"for a bearer token", Exchange(WithKey(), holderOfKey, Spec(kBearer)), kIssueUri,
       "exchange-bearer.xml"},
      {"full", Exchange(WithKey(), holderOfKey, FullSpec()), kIssueUri, "exchange-holder-of-key-full.xml"},
  });
}

TEST(RequestBuilder, BuildsValidate) {
  ExpectGolden({
      {"no key", Validate(WithoutKey(), SamlToken::CONFIRM_BEARER), kValidateUri, "validate.xml"},
      {"key", Validate(WithKey(), SamlToken::CONFIRM_HOLDER_OF_KEY), kValidateUri, "validate.xml"},
  });
}

TEST(RequestBuilder, BuildsRenew) {
  ExpectGolden({{"renew", Renew(WithKey(), 3600), kRenewUri, "renew.xml"}});
}

// --- Every combination ---

enum class Operation { PASSWORD, SPNEGO, CERTIFICATE, EXCHANGE };

// What a request is asked for, and what follows from it by the rules of the wire format.
struct Combination {
  Operation operation;
  bool hasKey;
  TokenSpec::Confirmation confirmation;
  bool delegate;
  bool audience;
  bool advice;
  bool renewable;
  bool delegable;

  bool AsksForHolderOfKey() const { return hasKey && confirmation == kDefault; }

  bool IsSigned() const {
    const bool always = operation == Operation::CERTIFICATE || operation == Operation::EXCHANGE;
    return always || (AsksForHolderOfKey() && !delegate);
  }

  bool NamesProof() const { return operation != Operation::EXCHANGE && AsksForHolderOfKey() && !delegate; }
};

TokenSpec SpecOf(const Combination& c) {
  TokenSpec spec = WithFlags(Spec(c.confirmation), c.renewable, c.delegable);
  spec = c.delegate ? WithDelegate(spec) : spec;
  spec = c.audience ? WithAudience(spec) : spec;
  return c.advice ? WithAdvice(spec) : spec;
}

// The golden file whose envelope the request must have, from its start to the key type and from the Issue
// body's end on.
std::string EnvelopeOf(const Combination& c) {
  switch (c.operation) {
    case Operation::PASSWORD:
      return c.IsSigned() ? "password-holder-of-key.xml" : "password-bearer.xml";
    case Operation::SPNEGO:
      return c.IsSigned() ? "spnego-initial-holder-of-key.xml" : "spnego-initial-bearer.xml";
    case Operation::CERTIFICATE:
      return "certificate.xml";
    case Operation::EXCHANGE:
      return "exchange-holder-of-key.xml";
  }
  return std::string();
}

std::string Part(const std::string& element) {
  const std::string full = ReadGoldenText("requests/password-bearer-full.xml");
  const std::string open = "<" + element;
  const std::string close = "</" + element + ">";
  return open + CutBetween(full, open, close) + close;
}

std::string Expected(const Combination& c) {
  const std::string envelope = ReadGoldenText("requests/" + EnvelopeOf(c));
  const std::string keyType = "<wst:KeyType>";
  const std::string tail =
      c.operation == Operation::SPNEGO ? "<wst:BinaryExchange" : "</wst:RequestSecurityToken>";
  const auto word = [](bool value) {
    return std::string(value ? "true" : "false");
  };
  return envelope.substr(0, envelope.find(keyType)) + keyType +
         "http://docs.oasis-open.org/ws-sx/ws-trust/200512/" +
         (c.AsksForHolderOfKey() ? "PublicKey" : "Bearer") + "</wst:KeyType>" + Part("wst:Lifetime") +
         "<wst:Renewing Allow=\"" + word(c.renewable) + "\" OK=\"false\"/><wst:Delegatable>" +
         word(c.delegable) + "</wst:Delegatable>" + (c.delegate ? Part("wst:DelegateTo") : "") +
         (c.audience ? Part("wst:Participants") : "") + (c.advice ? Part("rsa-advice:AdviceSet") : "") +
         (c.NamesProof() ? "<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>" : "") +
         envelope.substr(envelope.find(tail));
}

std::string Built(const Combination& c) {
  const RequestBuilderImpl builder = c.hasKey ? WithKey() : WithoutKey();
  const TokenSpec spec = SpecOf(c);
  Request request;
  switch (c.operation) {
    case Operation::PASSWORD:
      builder.BuildUserPassTokenRequest(kUserName, kPassword, spec, request);
      break;
    case Operation::SPNEGO:
      builder.BuildInitialSPNegoRequest(spec, kLeg, request);
      break;
    case Operation::CERTIFICATE:
      builder.BuildCertificateTokenRequest(spec, request);
      break;
    case Operation::EXCHANGE:
      builder.BuildExchangeTokenRequest(FakeSamlToken(), spec, request);
      break;
  }
  return Masked(request.body);
}

void ExpectEveryFlag(Operation operation, bool hasKey, TokenSpec::Confirmation confirmation) {
  for (unsigned flags = 0; flags < 32; ++flags) {
    const Combination c = {operation,        hasKey,           confirmation,     (flags & 1) != 0,
                           (flags & 2) != 0, (flags & 4) != 0, (flags & 8) != 0, (flags & 16) != 0};
    EXPECT_EQ(Built(c), Expected(c)) << "key " << hasKey << ", confirmation " << confirmation << ", flags "
                                     << flags;
  }
}

TEST(RequestBuilder, BuildsIssueByPasswordInEveryCombination) {
  ExpectEveryFlag(Operation::PASSWORD, false, kDefault);
  ExpectEveryFlag(Operation::PASSWORD, false, kBearer);
  ExpectEveryFlag(Operation::PASSWORD, true, kDefault);
  ExpectEveryFlag(Operation::PASSWORD, true, kBearer);
}

TEST(RequestBuilder, BuildsTheFirstSpnegoLegInEveryCombination) {
  ExpectEveryFlag(Operation::SPNEGO, false, kDefault);
  ExpectEveryFlag(Operation::SPNEGO, false, kBearer);
  ExpectEveryFlag(Operation::SPNEGO, true, kDefault);
  ExpectEveryFlag(Operation::SPNEGO, true, kBearer);
}

TEST(RequestBuilder, BuildsIssueByCertificateInEveryCombination) {
  ExpectEveryFlag(Operation::CERTIFICATE, true, kDefault);
}

TEST(RequestBuilder, BuildsIssueByTokenInEveryCombination) {
  ExpectEveryFlag(Operation::EXCHANGE, true, kDefault);
  ExpectEveryFlag(Operation::EXCHANGE, true, kBearer);
}

// --- Constants and interface ---

TEST(Request, KnowsTheActions) {
  EXPECT_STREQ(Request::ISSUE, kIssueUri);
  EXPECT_STREQ(Request::RENEW, kRenewUri);
  EXPECT_STREQ(Request::VALIDATE, kValidateUri);
  EXPECT_STREQ(Request::CHALLANGE, kChallengeUri);
}

TEST(RequestBuilder, HasItsOperationsInTheAgreedSlots) {
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildUserPassTokenRequest), 0);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildInitialSPNegoRequest), 1);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildContinuedSPNegoRequest), 2);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildCertificateTokenRequest), 3);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildExchangeTokenRequest), 4);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildValidateSubjectRequest), 5);
  EXPECT_EQ(SlotOf(&RequestBuilder::BuildRenewRequest), 6);
}

TEST(RequestBuilder, TakesHolderOfKeyWhereAKeyIsConfiguredUnlessToldOtherwise) {
  EXPECT_EQ(WithoutKey().GetEffectiveConfirmationType(kDefault), SamlToken::CONFIRM_BEARER);
  EXPECT_EQ(WithoutKey().GetEffectiveConfirmationType(kBearer), SamlToken::CONFIRM_BEARER);
  EXPECT_EQ(WithKey().GetEffectiveConfirmationType(kDefault), SamlToken::CONFIRM_HOLDER_OF_KEY);
  EXPECT_EQ(WithKey().GetEffectiveConfirmationType(kBearer), SamlToken::CONFIRM_BEARER);
  const TokenSpec::Confirmation unknown = static_cast<TokenSpec::Confirmation>(2);
  EXPECT_EQ(WithKey().GetEffectiveConfirmationType(unknown), SamlToken::CONFIRM_BEARER);
}

TEST(ConfOverrideWithDelegate, TakesARequestForADelegateAsABearers) {
  EXPECT_EQ(ConfOverrideWithDelegate(Spec(kDefault)), kDefault);
  EXPECT_EQ(ConfOverrideWithDelegate(Spec(kBearer)), kBearer);
  EXPECT_EQ(ConfOverrideWithDelegate(WithDelegate(Spec(kDefault))), kBearer);
  EXPECT_EQ(ConfOverrideWithDelegate(WithDelegate(Spec(kBearer))), kBearer);
  TokenSpec unnamed = Spec(kDefault);
  unnamed.delegateTo = std::string();
  EXPECT_EQ(ConfOverrideWithDelegate(unnamed), kBearer);
}

TEST(TokenSpec, StartsWithNothingAskedFor) {
  const TokenSpec spec;
  EXPECT_EQ(spec.tokenLifetimeSec, 0);
  EXPECT_TRUE(spec.audienceRestriction.empty());
  EXPECT_TRUE(spec.advice.empty());
  EXPECT_FALSE(spec.delegable);
  EXPECT_FALSE(spec.delegateTo);
  EXPECT_FALSE(spec.renewable);
  EXPECT_EQ(spec.confirmation, kDefault);
  EXPECT_EQ(TokenSpec::CONFIRMATION_DEFAULT, 0);
  EXPECT_EQ(TokenSpec::CONFIRMATION_BEARER, 1);
}

TEST(TokenSpec, CopiesEveryMember) {
  const TokenSpec full = FullSpec(kBearer);
  TokenSpec assigned;
  assigned = full;
  for (const TokenSpec& copy : {TokenSpec(full), assigned}) {
    EXPECT_EQ(copy.tokenLifetimeSec, 3600);
    EXPECT_EQ(copy.audienceRestriction, full.audienceRestriction);
    ASSERT_EQ(copy.advice.size(), 2u);
    EXPECT_EQ(copy.advice[0].source, "https://app.example/");
    ASSERT_EQ(copy.advice[0].attributes.size(), 2u);
    EXPECT_EQ(copy.advice[0].attributes[0].values, (std::vector<std::string>{"admin", "user"}));
    EXPECT_TRUE(copy.delegable);
    EXPECT_TRUE(copy.delegateTo == std::string("bob@example.com"));
    EXPECT_TRUE(copy.renewable);
    EXPECT_EQ(copy.confirmation, kBearer);
  }
}

TEST(SecurityTokenServiceConfig, StartsEmptyAndCopiesEveryMember) {
  SecurityTokenServiceConfig config;
  EXPECT_TRUE(config.stsUrl.empty());
  EXPECT_TRUE(config.trustedStsCertificates.empty());
  EXPECT_TRUE(config.sslConnectionParam.empty());
  EXPECT_FALSE(config.holderOfKeyConfig);
  EXPECT_FALSE(config.sslContext);
  config.stsUrl = "https://sts.example/";
  config.trustedStsCertificates.push_back(Identity().certificate);
  config.sslConnectionParam = "sha256//x";
  config.holderOfKeyConfig = Identity();
  SecurityTokenServiceConfig assigned;
  assigned = config;
  for (const SecurityTokenServiceConfig& copy : {SecurityTokenServiceConfig(config), assigned}) {
    EXPECT_EQ(copy.stsUrl, "https://sts.example/");
    ASSERT_EQ(copy.trustedStsCertificates.size(), 1u);
    EXPECT_EQ(copy.trustedStsCertificates.front(), Identity().certificate);
    EXPECT_EQ(copy.sslConnectionParam, "sha256//x");
    ASSERT_TRUE(copy.holderOfKeyConfig.is_initialized());
    EXPECT_EQ(copy.holderOfKeyConfig->privateKey, Identity().privateKey);
    EXPECT_EQ(copy.holderOfKeyConfig->certificate, Identity().certificate);
  }
}

// --- Checks of arguments and state ---

// The class and the whole text of what `build` throws, or "built".
std::string Failure(const BuildRequest& build) {
  Request request;
  try {
    build(request);
    return "built";
  } catch (const Pelmar::InvalidArgumentException& e) {
    return std::string("InvalidArgumentException: ") + e.what();
  } catch (const Pelmar::InvalidStateException& e) {
    return std::string("InvalidStateException: ") + e.what();
  }
}

TokenSpec Lasting(long long lifetimeSec, TokenSpec::Confirmation confirmation = kDefault) {
  TokenSpec spec = Spec(confirmation);
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

const char* const kNotPositive =
    "InvalidArgumentException: Invalid argument : Token lifetime must be positive";

TEST(RequestBuilder, RefusesLifetimesThatAreNotPositive) {
  constexpr SamlToken::ConfirmationType holderOfKey = SamlToken::CONFIRM_HOLDER_OF_KEY;
  for (const long long lifetime : {0LL, -1LL, -3600LL, std::numeric_limits<long long>::min()}) {
    // Before anything else: neither a missing key nor a wrong confirmation or token is looked at.
    EXPECT_EQ(Failure(Password(WithoutKey(), Lasting(lifetime))), kNotPositive);
    EXPECT_EQ(Failure(InitialSpnego(WithoutKey(), Lasting(lifetime))), kNotPositive);
    EXPECT_EQ(Failure(Certificate(WithoutKey(), Lasting(lifetime, kBearer))), kNotPositive);
    EXPECT_EQ(Failure(Exchange(WithoutKey(), holderOfKey, Lasting(lifetime))), kNotPositive);
    EXPECT_EQ(Failure(Renew(WithoutKey(), lifetime)), kNotPositive);
    EXPECT_EQ(Failure([lifetime](Request& request) {
                WithKey().BuildRenewRequest(FakeSamlToken(SamlToken::CONFIRM_BEARER), lifetime, request);
              }),
              kNotPositive);
  }
}

TEST(RequestBuilder, AcceptsEveryPositiveLifetime) {
  for (const long long lifetime : {1LL, 4294967296LL, std::numeric_limits<long long>::max()}) {
    EXPECT_EQ(Failure(Password(WithKey(), Lasting(lifetime))), "built") << lifetime;
    EXPECT_EQ(Failure(InitialSpnego(WithKey(), Lasting(lifetime))), "built") << lifetime;
    EXPECT_EQ(Failure(Certificate(WithKey(), Lasting(lifetime))), "built") << lifetime;
    EXPECT_EQ(Failure(Exchange(WithKey(), SamlToken::CONFIRM_BEARER, Lasting(lifetime))), "built")
        << lifetime;
    EXPECT_EQ(Failure(Renew(WithKey(), lifetime)), "built") << lifetime;
  }
}

TEST(RequestBuilder, NeedsAKeyForWhatMustBeSigned) {
  const std::string message = "InvalidStateException: No HolderOfKeyConfig provided. Unable to ";
  // The confirmation and the token are looked at later.
  EXPECT_EQ(Failure(Certificate(WithoutKey(), Spec(kBearer))), message + "acquire token by certificate");
  EXPECT_EQ(Failure(Exchange(WithoutKey(), SamlToken::CONFIRM_BEARER, Spec())),
            message + "acquire token by token");
  EXPECT_EQ(Failure([](Request& request) {
              WithoutKey().BuildRenewRequest(FakeSamlToken(SamlToken::CONFIRM_BEARER), 1, request);
            }),
            message + "renew token");
}

TEST(RequestBuilder, LeavesTheRequestAloneWhenACheckFails) {
  Request request;
  request.soapAction = "old action";
  request.body = "old body";
  EXPECT_THROW(WithoutKey().BuildCertificateTokenRequest(Spec(), request), Pelmar::InvalidStateException);
  EXPECT_EQ(request.soapAction, "old action");
  EXPECT_EQ(request.body, "old body");
}

TEST(RequestBuilder, KeepsTheOldBodyWhenBuildingFails) {
  Request request;
  request.soapAction = "old action";
  request.body = "old body";
  EXPECT_THROW(WithoutKey().BuildUserPassTokenRequest("\x01", "", Spec(), request),
               Pelmar::InvalidArgumentException);
  EXPECT_EQ(request.soapAction, Request::ISSUE);
  EXPECT_EQ(request.body, "old body");
}

TEST(RequestBuilder, RefusesABearerTokenByCertificate) {
  EXPECT_EQ(
      Failure(Certificate(WithKey(), Spec(kBearer))),
      "InvalidArgumentException: Invalid argument : TokenSpec::confirmation must be CONFIRMATION_DEFAULT for "
      "acquire token by certificate");
}

TEST(RequestBuilder, RefusesToRenewABearerToken) {
  EXPECT_EQ(
      Failure([](Request& request) {
        WithKey().BuildRenewRequest(FakeSamlToken(SamlToken::CONFIRM_BEARER), 1, request);
      }),
      "InvalidArgumentException: Invalid argument : Unable to renew token: the provided token must be Holder Of "
      "Key");
}

TEST(RequestBuilder, TellsWhatAHalfFilledConfigurationLacks) {
  HolderOfKeyConfig withoutKey;
  withoutKey.certificate = Identity().certificate;
  HolderOfKeyConfig withoutCertificate;
  withoutCertificate.privateKey = Identity().privateKey;
  const RequestBuilderImpl keyless(withoutKey);
  const RequestBuilderImpl certificateless(withoutCertificate);
  const std::string noKey = "InvalidStateException: HolderOfKeyConfig has no private key";
  EXPECT_EQ(Failure(Certificate(keyless, Spec())), noKey);
  EXPECT_EQ(Failure(Exchange(keyless, SamlToken::CONFIRM_BEARER, Spec())), noKey);
  EXPECT_EQ(Failure(Certificate(certificateless, Spec())),
            "InvalidStateException: HolderOfKeyConfig has no certificate");
  EXPECT_EQ(Failure(Exchange(certificateless, SamlToken::CONFIRM_BEARER, Spec())), "built");
}

TEST(RequestBuilder, PassesTheParsersExceptionOn) {
  const FakeSamlToken broken("_id", "<a>", SamlToken::CONFIRM_HOLDER_OF_KEY);
  Request request;
  EXPECT_THROW(WithKey().BuildValidateSubjectRequest(broken, request), Pelmar::Xml::XMLParseException);
  EXPECT_THROW(WithKey().BuildExchangeTokenRequest(broken, Spec(), request), Pelmar::Xml::XMLParseException);
  EXPECT_THROW(WithKey().BuildRenewRequest(broken, 1, request), Pelmar::Xml::XMLParseException);
}

// --- Texts of callers ---

// What XML 1.0 (production 2) cannot carry, and what is no UTF-8, each around a word that no message may
// repeat.
const std::string kForbiddenTexts[] = {std::string("secret\0", 7),
                                       "\x01secret",
                                       "secret\x08",
                                       "secret\x0B",
                                       "secret\x1F",
                                       "secret\xEF\xBF\xBE",
                                       "secret\xEF\xBF\xBF",
                                       "secret\xC3",
                                       "\xA9secret",
                                       "secret\xFF",
                                       "secret\xC0\xAF",
                                       "secret\xED\xA0\x80",
                                       "secret\xE2\x82",
                                       "secret\xF4\x90\x80\x80"};

struct Place {
  std::function<void(const std::string&, Request&)> build;
  const char* fault;
};

const char* const kBadText = "the text of a node is not XML text";

// Every place where a text of the caller goes into a request, and what is wrong there with one that XML
// cannot carry.
const Place kPlaces[] = {
    {[](const std::string& text, Request& request) {
       WithoutKey().BuildUserPassTokenRequest(text, kPassword, Spec(), request);
     },
     kBadText},
    {[](const std::string& text, Request& request) {
       WithKey().BuildUserPassTokenRequest(kUserName, text, Spec(), request);
     },
     kBadText},
    {[](const std::string& text, Request& request) {
       TokenSpec spec = Spec();
       spec.delegateTo = text;
       WithKey().BuildInitialSPNegoRequest(spec, kLeg, request);
     },
     kBadText},
    {[](const std::string& text, Request& request) {
       TokenSpec spec = Spec();
       spec.audienceRestriction = {"https://a.example/", text};
       WithKey().BuildCertificateTokenRequest(spec, request);
     },
     kBadText},
    {[](const std::string& text, Request& request) {
       TokenSpec spec = Spec();
       spec.advice = {Advice{text, {}}};
       WithKey().BuildExchangeTokenRequest(FakeSamlToken(), spec, request);
     },
     "the value of attribute 'AdviceSource' is not XML text"},
    {[](const std::string& text, Request& request) {
       TokenSpec spec = Spec();
       spec.advice = {Advice{"urn:s", {{text, {}}}}};
       WithoutKey().BuildInitialSPNegoRequest(spec, kLeg, request);
     },
     "the value of attribute 'Name' is not XML text"},
    {[](const std::string& text, Request& request) {
       TokenSpec spec = Spec();
       spec.advice = {Advice{"urn:s", {{"n", {"1", text}}}}};
       WithKey().BuildUserPassTokenRequest(kUserName, kPassword, spec, request);
     },
     kBadText},
    {[](const std::string& text, Request& request) {
       WithoutKey().BuildContinuedSPNegoRequest(text, kLeg, request);
     },
     "the value of attribute 'Context' is not XML text"},
};

TEST(RequestBuilder, RefusesTextThatXmlCannotCarryWithoutRepeatingIt) {
  for (const Place& place : kPlaces) {
    for (const std::string& text : kForbiddenTexts) {
      const std::string failure = Failure([&place, &text](Request& request) { place.build(text, request); });
      EXPECT_EQ(failure, std::string("InvalidArgumentException: Invalid argument : ") + place.fault);
    }
  }
}

class RequestBuilderDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(RequestBuilderDeathTest, AbortsOnSigningWithoutAKey) {
  const std::string message =
      "Verify failed: _holderOfKeyConfig.is_initialized() (lib/quorlin/RequestBuilderImpl)\n";
  const RequestBuilderImpl builder = WithoutKey();
  const XMLBuilderPtr header = WsSecurityHeaderBuilder(10);
  const XMLBuilderPtr body = ElementBuilder("b", "body");
  EXPECT_EXIT(builder.BuildCertRefSignedRequest(header, body), KilledBySignal(SIGABRT), Eq(message));
  EXPECT_EXIT(builder.BuildSamlRefSignedRequest("_id", header, body), KilledBySignal(SIGABRT), Eq(message));
}

TEST_F(RequestBuilderDeathTest, AbortsOnATokenThatChangesItsConfirmation) {
  const RequestBuilderImpl builder = WithKey();
  const FakeSamlToken token(SamlToken::CONFIRM_BEARER);
  token.firstAnswers = {SamlToken::CONFIRM_HOLDER_OF_KEY};
  Request request;
  EXPECT_EXIT(builder.BuildRenewRequest(token, 1, request), KilledBySignal(SIGABRT),
              Eq("Verify failed: token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY "
                 "(lib/quorlin/RequestBuilderImpl)\n"));
}

// --- Threads ---

TEST(RequestBuilder, BuildsOnSeveralThreadsAtOnce) {
  const RequestBuilderImpl builder = WithKey();
  const std::string expected = ReadGoldenText("requests/certificate.xml");
  std::vector<std::future<std::string>> others;
  for (int i = 0; i < 4; ++i) {
    others.push_back(std::async(std::launch::async, [&builder] {
      Request request;
      builder.BuildCertificateTokenRequest(Spec(), request);
      return request.body;
    }));
  }
  for (std::future<std::string>& other : others) {
    EXPECT_EQ(Masked(other.get()), expected);
  }
}

}  // namespace
}  // namespace Quorlin
