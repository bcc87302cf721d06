// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/TrustChainKeyResolver.h"

#include "pelmar/crypto/CertificateChain.h"
#include "pelmar/crypto/VerifiedChainCache.h"
#include "support/Pki.h"
#include "support/SignatureDocuments.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <gtest/gtest.h>

#include <list>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using namespace TestSupport;
using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::Crypto::VerifiedChainCache;
using Pelmar::System::DateTime;
using TrustList = std::list<Ref<const Certificate>>;

constexpr long long kMicroseconds = 1000000;

DateTime FromNow(long long seconds) {
  return Pelmar::System::DateTimeFromUtc(
      Pelmar::System::GetUtcDateTime().GetUtcTime() + seconds * kMicroseconds, false);
}

std::string Base64(const Identity& identity) {
  return Pelmar::StringUtil::Base64Encode(identity.certificate->GetDer());
}

std::string X509Certificate(const Identity& identity) {
  return "<ds:X509Certificate>" + Base64(identity) + "</ds:X509Certificate>";
}

Ref<Document> ParseKeyInfo(const std::string& content) {
  return ParseDocument("<ds:KeyInfo xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\">" + content +
                       "</ds:KeyInfo>");
}

Ref<Document> MakeKeyInfo(const std::vector<Identity>& identities) {
  std::string certificates;
  for (const Identity& identity : identities) {
    certificates += X509Certificate(identity);
  }
  return ParseKeyInfo("<ds:X509Data>" + certificates + "</ds:X509Data>");
}

/// The subject of the signer that is accepted at `now`, or why there is none. Nothing is remembered from
/// earlier calls.
std::string ResolveAt(const Ref<Document>& keyInfo, const TrustList& trusted, const DateTime& now) {
  VerifiedChainCache cache;
  const Ref<TrustChainKeyResolver> resolver = Pelmar::MakeRef<TrustChainKeyResolver>(trusted, cache);
  try {
    return resolver->ResolveSignerAt(keyInfo ? keyInfo->GetDocumentElement() : nullptr, now)->GetSubject();
  } catch (const XmlSecurityException& error) {
    return error.what();
  }
}

std::string Resolve(const Ref<Document>& keyInfo, const TrustList& trusted) {
  return ResolveAt(keyInfo, trusted, FromNow(0));
}

std::string Resolve(const std::vector<Identity>& shown, const TrustList& trusted) {
  return Resolve(MakeKeyInfo(shown), trusted);
}

CertificateSpec Named(const std::string& commonName, unsigned keyNumber = 0) {
  CertificateSpec spec;
  spec.commonName = commonName;
  spec.keyNumber = keyNumber;
  return spec;
}

CertificateSpec CaNamed(const std::string& commonName, unsigned keyNumber) {
  CertificateSpec spec = Named(commonName, keyNumber);
  spec.ca = true;
  return spec;
}

/// root -> intermediate -> leaf.
struct Chain {
  Identity root = MakeCa("Root", 1);
  Identity intermediate = MakeIssued(root, CaNamed("Intermediate", 2));
  Identity leaf = MakeIssued(intermediate, Named("Leaf"));
};

const Chain& GetChain() {
  static const Chain chain;
  return chain;
}

TEST(TrustChainKeyResolver, AcceptsChainsToATrustedCertificate) {
  const Chain& c = GetChain();
  const Identity other = MakeCa("Other", 5);
  EXPECT_EQ(Resolve({c.leaf, c.intermediate}, Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf, c.intermediate, c.root}, Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf}, Trust({c.intermediate})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf}, Trust({c.intermediate, c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf}, Trust({c.leaf})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf, c.intermediate, c.root}, Trust({c.leaf})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf, c.intermediate, c.root}, Trust({c.intermediate})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf, c.intermediate}, Trust({other, c.root, other})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.leaf, c.leaf, c.intermediate, c.intermediate}, Trust({c.root})), "CN=Leaf");
  TrustList withNulls = {nullptr, c.root.certificate, nullptr};
  EXPECT_EQ(Resolve({c.leaf, c.intermediate}, withNulls), "CN=Leaf");
}

TEST(TrustChainKeyResolver, FindsTheSignerWhateverTheOrder) {
  const Chain& c = GetChain();
  EXPECT_EQ(Resolve({c.intermediate, c.leaf}, Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.root, c.intermediate, c.leaf}, Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.intermediate, c.leaf, c.leaf}, Trust({c.root})), "CN=Leaf");
}

TEST(TrustChainKeyResolver, TakesTheFirstOfSeveralPossibleSigners) {
  const Chain& c = GetChain();
  const Identity sibling = MakeIssued(c.intermediate, Named("Sibling", 3));
  EXPECT_EQ(Resolve({sibling, c.leaf, c.intermediate}, Trust({c.root})), "CN=Sibling");
  EXPECT_EQ(Resolve({c.leaf, sibling, c.intermediate}, Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(Resolve({c.intermediate, c.leaf, sibling}, Trust({c.root})),
            "The certificate's key usage does not allow signatures (CN=Intermediate)");
}

// That it issued itself makes a certificate no issuer of others.
TEST(TrustChainKeyResolver, TakesASelfSignedCertificateForAPossibleSigner) {
  const Chain& c = GetChain();
  CertificateSpec spec = Named("Self-signed", 3);
  spec.keyUsage = "digitalSignature,keyCertSign";
  const Identity selfSigned = MakeSelfSigned(spec);
  EXPECT_EQ(Resolve({selfSigned, c.leaf, c.intermediate}, Trust({selfSigned, c.root})), "CN=Self-signed");
}

TEST(TrustChainKeyResolver, TakesTheFirstWhereAllIssuedEachOther) {
  CertificateSpec spec = CaNamed("One", 3);
  spec.keyUsage = "digitalSignature,keyCertSign";
  const Identity root = MakeSelfSigned(spec);
  spec = CaNamed("Other", 4);
  spec.keyUsage = "digitalSignature,keyCertSign";
  const Identity other = MakeIssued(root, spec);
  spec = CaNamed("One", 3);
  spec.keyUsage = "digitalSignature,keyCertSign";
  const Identity one = MakeIssued(other, spec);
  EXPECT_EQ(Resolve({one, other}, Trust({one, other})), "CN=One");
  EXPECT_EQ(Resolve({other, one}, Trust({one, other})), "CN=Other");
}

TEST(TrustChainKeyResolver, ReadsCertificatesOfSeveralX509Data) {
  const Chain& c = GetChain();
  const Ref<Document> keyInfo = ParseKeyInfo(
      "<ds:KeyName>Leaf</ds:KeyName><ds:X509Data><ds:X509SubjectName>CN=Evil</ds:X509SubjectName>" +
      X509Certificate(c.leaf) + "</ds:X509Data> <!-- c --><ds:X509Data>" + X509Certificate(c.intermediate) +
      "<ds:X509CRL>AA==</ds:X509CRL></ds:X509Data><x xmlns=\"urn:x\"/>");
  EXPECT_EQ(Resolve(keyInfo, Trust({c.root})), "CN=Leaf");
}

TEST(TrustChainKeyResolver, TrustsNothingWithoutTrustedCertificates) {
  const Chain& c = GetChain();
  EXPECT_EQ(Resolve({c.leaf, c.intermediate}, TrustList()),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Intermediate)");
  EXPECT_EQ(Resolve({c.leaf}, TrustList{nullptr}),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Leaf)");
  EXPECT_EQ(Resolve({c.root}, TrustList()),
            "The certificate's key usage does not allow signatures (CN=Root)");
  EXPECT_EQ(Resolve({MakeSelfSigned(Named("Alone"))}, TrustList()),
            "Certificate chain is not trusted: self-signed certificate (CN=Alone)");
}

TEST(TrustChainKeyResolver, RefusesStrangers) {
  const Chain& c = GetChain();
  const TrustList trusted = Trust({c.root});
  EXPECT_EQ(Resolve({MakeSelfSigned(Named("Leaf", 9))}, trusted),
            "Certificate chain is not trusted: self-signed certificate (CN=Leaf)");
  // The same names all the way up, but other keys.
  const Identity falseRoot = MakeCa("Root", 6);
  const Identity falseIntermediate = MakeIssued(falseRoot, CaNamed("Intermediate", 7));
  const Identity falseLeaf = MakeIssued(falseIntermediate, Named("Leaf", 8));
  EXPECT_EQ(Resolve({falseLeaf, falseIntermediate, falseRoot}, trusted),
            "Certificate chain is not trusted: certificate signature failure (CN=Intermediate)");
  EXPECT_EQ(Resolve({falseLeaf, c.intermediate}, trusted),
            "Certificate chain is not trusted: certificate signature failure (CN=Leaf)");
  EXPECT_EQ(Resolve({c.leaf}, trusted),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Leaf)");
}

TEST(TrustChainKeyResolver, UsesKeyIdentifiersToFindIssuers) {
  CertificateSpec caSpec = CaNamed("Identified CA", 1);
  caSpec.keyIdentifiers = true;
  CertificateSpec leafSpec = Named("Identified leaf");
  leafSpec.keyIdentifiers = true;
  const Identity ca = MakeSelfSigned(caSpec);
  caSpec.keyNumber = 2;
  const Identity renewed = MakeSelfSigned(caSpec);
  const Identity leaf = MakeIssued(renewed, leafSpec);
  EXPECT_EQ(Resolve({leaf}, Trust({ca, renewed})), "CN=Identified leaf");
  EXPECT_EQ(Resolve({leaf}, Trust({ca})),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Identified leaf)");
}

TEST(TrustChainKeyResolver, RefusesTheNameOfATrustedSignerWithAnotherKey) {
  const Identity genuine = MakeSelfSigned(Named("Signer"));
  EXPECT_EQ(Resolve({MakeSelfSigned(Named("Signer", 9))}, Trust({genuine})),
            "Certificate chain is not trusted: self-signed certificate (CN=Signer)");
}

TEST(TrustChainKeyResolver, RefusesWhatIsOutOfItsTime) {
  const Chain& c = GetChain();
  CertificateSpec expired = Named("Expired", 3);
  expired.notBefore = -2 * kDay;
  expired.notAfter = -kDay;
  CertificateSpec future = Named("Future", 3);
  future.notBefore = kDay;
  EXPECT_EQ(Resolve({MakeIssued(c.root, expired)}, Trust({c.root})),
            "Certificate chain is not trusted: certificate has expired (CN=Expired)");
  EXPECT_EQ(Resolve({MakeIssued(c.root, future)}, Trust({c.root})),
            "Certificate chain is not trusted: certificate is not yet valid (CN=Future)");
  // That it is trusted itself does not help.
  const Identity own = MakeSelfSigned(expired);
  EXPECT_EQ(Resolve({own}, Trust({own})),
            "Certificate chain is not trusted: certificate has expired (CN=Expired)");

  CertificateSpec expiredCa = CaNamed("Expired CA", 4);
  expiredCa.notBefore = -2 * kDay;
  expiredCa.notAfter = -kDay;
  const Identity issuer = MakeIssued(c.root, expiredCa);
  EXPECT_EQ(Resolve({MakeIssued(issuer, Named("Leaf")), issuer}, Trust({c.root})),
            "Certificate chain is not trusted: certificate has expired (CN=Expired CA)");
}

TEST(TrustChainKeyResolver, RefusesIssuersThatAreNoCa) {
  const Chain& c = GetChain();
  const Identity noCa = MakeIssued(c.root, Named("No CA", 3));
  EXPECT_EQ(Resolve({MakeIssued(noCa, Named("Below", 4)), noCa}, Trust({c.root})),
            "Certificate chain is not trusted: invalid CA certificate (CN=No CA)");
  CertificateSpec withoutUsage = Named("No CA", 3);
  withoutUsage.keyUsage = "";
  const Identity unrestricted = MakeIssued(c.root, withoutUsage);
  EXPECT_EQ(Resolve({MakeIssued(unrestricted, Named("Below", 4)), unrestricted}, Trust({c.root})),
            "Certificate chain is not trusted: invalid CA certificate (CN=No CA)");
}

// A signer that is trusted for its own signatures is not thereby trusted to make others signers.
TEST(TrustChainKeyResolver, RefusesWhatATrustedSignerIssued) {
  for (const bool withoutBasicConstraints : {false, true}) {
    CertificateSpec spec = Named("Trusted signer", 3);
    spec.keyUsage = "digitalSignature,keyCertSign";
    spec.withoutBasicConstraints = withoutBasicConstraints;
    const Identity signer = MakeSelfSigned(spec);
    EXPECT_EQ(Resolve({signer}, Trust({signer})), "CN=Trusted signer");
    EXPECT_EQ(Resolve({MakeIssued(signer, Named("Below", 4))}, Trust({signer})),
              "Certificate chain is not trusted: invalid CA certificate (CN=Trusted signer)")
        << withoutBasicConstraints;
  }
}

TEST(TrustChainKeyResolver, WantsAKeyUsageThatAllowsSignatures) {
  const Identity ca = MakeCa();
  const auto withUsage = [&ca](const char* usage) {
    CertificateSpec spec = Named("Signer");
    spec.keyUsage = usage;
    return Resolve({MakeIssued(ca, spec)}, Trust({ca}));
  };
  EXPECT_EQ(withUsage(""), "CN=Signer");
  EXPECT_EQ(withUsage("digitalSignature"), "CN=Signer");
  EXPECT_EQ(withUsage("nonRepudiation"), "CN=Signer");
  EXPECT_EQ(withUsage("keyEncipherment"),
            "The certificate's key usage does not allow signatures (CN=Signer)");
  EXPECT_EQ(withUsage("keyCertSign,cRLSign"),
            "The certificate's key usage does not allow signatures (CN=Signer)");
}

TEST(TrustChainKeyResolver, RefusesUnknownCriticalExtensions) {
  CertificateSpec spec = Named("Critical");
  spec.unknownCriticalExtension = true;
  const Identity signer = MakeSelfSigned(spec);
  EXPECT_EQ(Resolve({signer}, Trust({signer})),
            "Certificate chain is not trusted: unhandled critical extension (CN=Critical)");
}

TEST(TrustChainKeyResolver, RefusesWeakKeysAndDigests) {
  const Identity ca = MakeCa();
  CertificateSpec weakKey = Named("Weak key");
  weakKey.keyKind = KeyKind::RSA_1024;
  EXPECT_EQ(Resolve({MakeIssued(ca, weakKey)}, Trust({ca})),
            "Certificate chain is not trusted: EE certificate key too weak (CN=Weak key)");
  CertificateSpec weakDigest = Named("Weak digest");
  weakDigest.digest = "SHA1";
  EXPECT_EQ(Resolve({MakeIssued(ca, weakDigest)}, Trust({ca})),
            "Certificate chain is not trusted: CA signature digest algorithm too weak (CN=Weak digest)");
  // Nobody relies on the signature of a trusted certificate on itself.
  const Identity anchor = MakeSelfSigned(weakDigest);
  EXPECT_EQ(Resolve({anchor}, Trust({anchor})), "CN=Weak digest");
}

TEST(TrustChainKeyResolver, WantsACertificate) {
  const Chain& c = GetChain();
  const TrustList trusted = Trust({c.leaf});
  EXPECT_EQ(Resolve(Ref<Document>(), trusted), "The signature has no KeyInfo");
  const std::string modulus =
      "<ds:RSAKeyValue><ds:Modulus>AQAB</ds:Modulus><ds:Exponent>AQAB</ds:Exponent></ds:RSAKeyValue>";
  const std::string contents[] = {
      "",
      "text",
      "<ds:KeyName>CN=Leaf</ds:KeyName>",
      "<ds:KeyValue>" + modulus + "</ds:KeyValue>",
      "<ds:RetrievalMethod URI=\"#k\"/>",
      "<ds:X509Data/>",
      "<ds:X509Data><ds:X509SubjectName>CN=Leaf</ds:X509SubjectName></ds:X509Data>",
      "<ds:X509Data><X509Certificate>" + Base64(c.leaf) + "</X509Certificate></ds:X509Data>",
      "<X509Data xmlns=\"urn:x\">" + X509Certificate(c.leaf) + "</X509Data>",
      "<ds:Other><ds:X509Data>" + X509Certificate(c.leaf) + "</ds:X509Data></ds:Other>",
  };
  for (const std::string& content : contents) {
    EXPECT_EQ(Resolve(ParseKeyInfo(content), trusted), "The signature's KeyInfo holds no certificate")
        << content;
  }
}

TEST(TrustChainKeyResolver, RefusesWhatIsNoCertificate) {
  const TrustList trusted = Trust({GetChain().leaf});
  const auto refusal = [&trusted](const std::string& content) {
    return Resolve(
        ParseKeyInfo("<ds:X509Data><ds:X509Certificate>" + content + "</ds:X509Certificate></ds:X509Data>"),
        trusted);
  };
  EXPECT_EQ(refusal("!"), "Element 'ds:X509Certificate' must hold base64 text at line 1, column 72");
  EXPECT_EQ(refusal(""), "Element 'ds:X509Certificate' must hold one text at line 1, column 72");
  EXPECT_EQ(refusal("AA<!-- c -->=="),
            "Element 'ds:X509Certificate' must hold one text at line 1, column 72");
  EXPECT_EQ(refusal("AAAA").rfind("The certificate cannot be read", 0), 0u);
  std::vector<unsigned char> longer = GetChain().leaf.certificate->GetDer();
  longer.push_back(0);
  EXPECT_EQ(refusal(Pelmar::StringUtil::Base64Encode(longer)), "The certificate is followed by other data");
}

TEST(TrustChainKeyResolver, TakesABoundedNumberOfCertificates) {
  const Chain& c = GetChain();
  EXPECT_EQ(Resolve(std::vector<Identity>(10, c.leaf), Trust({c.leaf})), "CN=Leaf");
  EXPECT_EQ(Resolve(std::vector<Identity>(11, c.leaf), Trust({c.leaf})),
            "The signature's KeyInfo holds more than 10 certificates");
}

// ---- What is remembered ----

TEST(TrustChainKeyResolver, NeverRemembersBeyondTheTimeOfTheChain) {
  CertificateSpec rootSpec = CaNamed("Root", 1);
  rootSpec.notBefore = -2 * kDay;
  const Identity root = MakeSelfSigned(rootSpec);
  CertificateSpec issuerSpec = CaNamed("Short CA", 2);
  issuerSpec.notBefore = -kDay;
  issuerSpec.notAfter = kDay;
  const Identity issuer = MakeIssued(root, issuerSpec);
  const Identity leaf = MakeIssued(issuer, Named("Leaf"));
  const Ref<Document> keyInfo = MakeKeyInfo({leaf, issuer});
  VerifiedChainCache cache;
  const Ref<TrustChainKeyResolver> resolver = Pelmar::MakeRef<TrustChainKeyResolver>(Trust({root}), cache);
  const auto resolve = [&](const DateTime& now) {
    try {
      return resolver->ResolveSignerAt(keyInfo->GetDocumentElement(), now)->GetSubject();
    } catch (const XmlSecurityException& error) {
      return std::string(error.what());
    }
  };
  const long long notAfter = issuer.certificate->GetNotAfter().GetUtcTime();
  const long long notBefore = leaf.certificate->GetNotBefore().GetUtcTime();
  const auto at = [](long long microseconds) {
    return Pelmar::System::DateTimeFromUtc(microseconds, false);
  };
  EXPECT_EQ(resolve(FromNow(0)), "CN=Leaf");
  EXPECT_EQ(resolve(at(notAfter - 1)), "CN=Leaf");
  EXPECT_EQ(resolve(at(notAfter)), "Certificate chain is not trusted: certificate has expired (CN=Short CA)");
  EXPECT_EQ(resolve(at(notBefore)), "CN=Leaf");
  EXPECT_EQ(resolve(at(notBefore - 1)),
            "Certificate chain is not trusted: certificate is not yet valid (CN=Leaf)");
}

// Whichever of them begins last and ends first.
TEST(TrustStore, TellsTheTimeInWhichAllCertificatesOfTheChainAreValid) {
  for (std::size_t shortest = 0; shortest < 3; ++shortest) {
    CertificateSpec specs[] = {CaNamed("Root", 1), CaNamed("Intermediate", 2), Named("Leaf")};
    for (CertificateSpec& spec : specs) {
      spec.notBefore = -2 * kDay;
      spec.notAfter = 2 * kDay;
    }
    specs[shortest].notBefore = -kDay;
    specs[shortest].notAfter = kDay;
    const Identity root = MakeSelfSigned(specs[0]);
    const Identity intermediate = MakeIssued(root, specs[1]);
    const Identity chain[] = {root, intermediate, MakeIssued(intermediate, specs[2])};
    const auto own = [&chain](std::size_t i) {
      return Pelmar::Crypto::ToCertificateImpl(chain[i].certificate.Get());
    };
    const Pelmar::Crypto::ChainValidity validity =
        Pelmar::Crypto::TrustStore({own(0)}).Verify(*own(2), {own(1)}, FromNow(0));
    EXPECT_EQ(validity.notBefore.ToString(), chain[shortest].certificate->GetNotBefore().ToString());
    EXPECT_EQ(validity.notAfter.ToString(), chain[shortest].certificate->GetNotAfter().ToString());
  }
}

TEST(TrustChainKeyResolver, RemembersPerTrustList) {
  const Chain& c = GetChain();
  const Identity other = MakeCa("Other", 5);
  const Ref<Document> keyInfo = MakeKeyInfo({c.leaf, c.intermediate});
  const ElementNode* const element = keyInfo->GetDocumentElement();
  VerifiedChainCache cache;
  const auto resolve = [&](const TrustList& trusted) {
    try {
      return Pelmar::MakeRef<TrustChainKeyResolver>(trusted, cache)->ResolveSigner(element)->GetSubject();
    } catch (const XmlSecurityException& error) {
      return std::string(error.what());
    }
  };
  EXPECT_EQ(resolve(Trust({c.root})), "CN=Leaf");
  EXPECT_EQ(resolve(Trust({other})),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Intermediate)");
  EXPECT_EQ(resolve(TrustList()),
            "Certificate chain is not trusted: unable to get local issuer certificate (CN=Intermediate)");
  EXPECT_EQ(resolve(Trust({c.root})), "CN=Leaf");
}

TEST(TrustChainKeyResolver, HandsOutTheSameCertificateAgain) {
  const Chain& c = GetChain();
  const Ref<Document> keyInfo = MakeKeyInfo({c.leaf, c.intermediate});
  VerifiedChainCache cache;
  const Ref<TrustChainKeyResolver> resolver = Pelmar::MakeRef<TrustChainKeyResolver>(Trust({c.root}), cache);
  const Ref<const Certificate> first = resolver->ResolveSigner(keyInfo->GetDocumentElement());
  EXPECT_EQ(resolver->ResolveSigner(keyInfo->GetDocumentElement()), first);
}

TEST(TrustChainKeyResolver, DoesNotReadATrustedCertificateAgain) {
  const Identity signer = MakeSelfSigned(Named("Signer"));
  VerifiedChainCache cache(0);
  const Ref<TrustChainKeyResolver> resolver = Pelmar::MakeRef<TrustChainKeyResolver>(Trust({signer}), cache);
  EXPECT_EQ(resolver->ResolveSigner(MakeKeyInfo({signer})->GetDocumentElement()), signer.certificate);
}

TEST(TrustChainKeyResolver, ServesSeveralThreadsAtOnce) {
  constexpr int kThreads = 4;
  constexpr int kRounds = 25;
  const Chain& c = GetChain();
  const Ref<Document> keyInfos[] = {MakeKeyInfo({c.leaf, c.intermediate}),
                                    MakeKeyInfo({c.intermediate, c.leaf}),
                                    MakeKeyInfo({c.leaf, c.intermediate, c.root})};
  // Too small for all three, so that entries come and go all the time.
  VerifiedChainCache cache(2);
  const Ref<TrustChainKeyResolver> resolver = Pelmar::MakeRef<TrustChainKeyResolver>(Trust({c.root}), cache);
  std::vector<int> good(kThreads);
  std::vector<std::thread> threads;
  for (int& count : good) {
    threads.emplace_back([&count, &keyInfos, &resolver] {
      for (int round = 0; round < kRounds; ++round) {
        for (const Ref<Document>& keyInfo : keyInfos) {
          count += resolver->ResolveSigner(keyInfo->GetDocumentElement())->GetSubject() == "CN=Leaf" ? 1 : 0;
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(good, std::vector<int>(kThreads, 3 * kRounds));
}

Pelmar::Crypto::ChainFingerprint Fingerprint(unsigned char value) {
  return Pelmar::Crypto::ChainFingerprint(32, value);
}

TEST(VerifiedChainCache, ForgetsWhatWasUsedLeastRecently) {
  const Identity signer = MakeSelfSigned(Named("Signer"));
  const Pelmar::Crypto::ChainValidity always = {FromNow(-kDay), FromNow(kDay)};
  VerifiedChainCache cache(2);
  cache.Add(Fingerprint(1), signer.certificate, always);
  cache.Add(Fingerprint(2), signer.certificate, always);
  EXPECT_TRUE(cache.Find(Fingerprint(1), FromNow(0)));
  cache.Add(Fingerprint(3), signer.certificate, always);
  EXPECT_TRUE(cache.Find(Fingerprint(1), FromNow(0)));
  EXPECT_FALSE(cache.Find(Fingerprint(2), FromNow(0)));
  EXPECT_TRUE(cache.Find(Fingerprint(3), FromNow(0)));
}

TEST(VerifiedChainCache, HoldsEachChainOnceAndNoMoreThanItsCapacity) {
  const Identity signer = MakeSelfSigned(Named("Signer"));
  const Pelmar::Crypto::ChainValidity always = {FromNow(-kDay), FromNow(kDay)};
  const Pelmar::Crypto::ChainFingerprint chains[] = {Fingerprint(0), Fingerprint(1), Fingerprint(2),
                                                     Fingerprint(3)};
  VerifiedChainCache cache(2);
  for (const Pelmar::Crypto::ChainFingerprint& chain : {chains[0], chains[0], chains[1]}) {
    cache.Add(chain, signer.certificate, always);
  }
  EXPECT_TRUE(cache.Find(chains[0], FromNow(0)));
  EXPECT_TRUE(cache.Find(chains[1], FromNow(0)));
  cache.Add(chains[2], signer.certificate, always);
  cache.Add(chains[3], signer.certificate, always);
  EXPECT_FALSE(cache.Find(chains[0], FromNow(0)));
  EXPECT_FALSE(cache.Find(chains[1], FromNow(0)));
  EXPECT_TRUE(cache.Find(chains[2], FromNow(0)));
  EXPECT_TRUE(cache.Find(chains[3], FromNow(0)));
}

TEST(VerifiedChainCache, TellsListsApartThatHaveTheSameBytes) {
  using Pelmar::Crypto::ComputeChainFingerprint;
  EXPECT_NE(ComputeChainFingerprint({{1, 2}, {3}}, {}), ComputeChainFingerprint({{1}, {2, 3}}, {}));
  EXPECT_NE(ComputeChainFingerprint({{1, 2}}, {}), ComputeChainFingerprint({{2, 1}}, {}));
  EXPECT_EQ(ComputeChainFingerprint({{1, 2}, {3}}, {}), ComputeChainFingerprint({{1, 2}, {3}}, {}));
}

}  // namespace
