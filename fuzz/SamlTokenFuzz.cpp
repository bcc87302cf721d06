// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The seeds are tokens that the trusted key signed. Whatever is made of them is refused with an expected
// exception, or means, by all its getters, what one of the signed tokens means: nobody else has the key.

#include "SamlTokenFuzzOriginals.h"
#include "quorlin/xmlReading.h"

#include "../tests/support/TokenMeaning.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/xml/Node.h>
#include <quorlin/SamlToken.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <list>
#include <string>

namespace {

using TrustList = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

bool IsOriginal(const std::string& meaning) {
  return std::any_of(std::begin(kOriginalMeanings), std::end(kOriginalMeanings),
                     [&meaning](const char* original) { return meaning == original; });
}

/// What the token that `create` makes means; empty when it is refused.
template <typename Create>
std::string Judge(Create create) {
  try {
    const std::string meaning = TestSupport::MeaningOf(*create());
    Require(IsOriginal(meaning));
    return meaning;
  } catch (const Pelmar::Exception&) {
    return std::string();
  } catch (Quorlin::ParseException* error) {
    delete error;
    return std::string();
  }
}

boost::shared_ptr<Quorlin::SamlToken> CreateThroughDom(const std::string& text, const TrustList& trusted) {
  Pelmar::Ref<Pelmar::Xml::Document> document;
  Quorlin::ParseXML(text, document);
  return Quorlin::CreateSamlTokenFromDom(document->GetDocumentElement(), trusted);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const TrustList trusted = {Pelmar::Crypto::CreateCertificateFromPem(kTrustedCertificate)};
  const std::string text(data, data + size);
  const std::string fromText = Judge([&] { return Quorlin::CreateSamlToken(text, trusted); });
  const std::string fromDom = Judge([&] { return CreateThroughDom(text, trusted); });
  // The two ways to a token judge the same tree.
  Require(fromText == fromDom);
  return 0;
}
