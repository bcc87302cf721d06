// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Any texts of a caller either are refused, because XML 1.0 cannot carry them, or come back unchanged when
// the request is parsed. The input is cut into texts at the byte 0x1E, which XML cannot carry; each is put
// where callers' texts go.

#include <pelmar/Exception.h>
#include <pelmar/Ref.h>
#include <pelmar/StringUtil.h>
#include <pelmar/xml/Node.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <initializer_list>
#include <set>
#include <string>
#include <vector>

#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/xmlReading.h"

namespace {

using Pelmar::Xml::ElementNode;
using Quorlin::Request;
using Quorlin::RequestBuilderImpl;
using Quorlin::TokenSpec;

constexpr char kSeparator = '\x1E';

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

std::vector<std::string> Split(const std::string& input) {
  std::vector<std::string> texts(1);
  for (const char c : input) {
    if (c == kSeparator) {
      texts.emplace_back();
    } else {
      texts.back() += c;
    }
  }
  return texts;
}

// What a caller may say, taken from the input; texts that are missing are empty.
struct Texts {
  std::string userName;
  std::string password;
  std::string delegate;
  std::string audience;
  std::string source;
  std::string name;
  std::string value;
  std::string context;
};

Texts ToTexts(std::vector<std::string> texts) {
  texts.resize(8);
  return {texts[0], texts[1], texts[2], texts[3], texts[4], texts[5], texts[6], texts[7]};
}

bool AreXmlTexts(std::initializer_list<std::string> texts) {
  for (const std::string& text : texts) {
    if (!Pelmar::StringUtil::IsXmlText(text)) {
      return false;
    }
  }
  return true;
}

const ElementNode* Find(const ElementNode* element, std::initializer_list<const char*> path) {
  for (const char* const localName : path) {
    element = element->FindChildElement(localName);
    Require(element != nullptr);
  }
  return element;
}

std::string TextOf(const ElementNode* element) {
  return Quorlin::GetText(Quorlin::GetTextNode(element));
}

std::string AttributeOf(const ElementNode* element, const char* name) {
  std::string value;
  Require(element->GetAttribute(name, value));
  return value;
}

Pelmar::Ref<Pelmar::Xml::Document> Parse(const std::string& body) {
  Pelmar::Ref<Pelmar::Xml::Document> document;
  Quorlin::ParseXML(body, document);
  return document;
}

void CheckIssue(const Texts& texts) {
  TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  spec.delegateTo = texts.delegate;
  spec.audienceRestriction.insert(texts.audience);
  spec.advice.push_back(Quorlin::Advice{texts.source, {{texts.name, {texts.value}}}});
  Request request;
  try {
    RequestBuilderImpl(boost::none).BuildUserPassTokenRequest(texts.userName, texts.password, spec, request);
  } catch (const Pelmar::InvalidArgumentException&) {
    Require(!AreXmlTexts({texts.userName, texts.password, texts.delegate, texts.audience, texts.source,
                          texts.name, texts.value}));
    return;
  }
  const Pelmar::Ref<Pelmar::Xml::Document> document = Parse(request.body);
  const ElementNode* const envelope = document->GetDocumentElement();
  const ElementNode* const credential = Find(envelope, {"Header", "Security", "UsernameToken"});
  Require(TextOf(Find(credential, {"Username"})) == texts.userName);
  Require(TextOf(Find(credential, {"Password"})) == texts.password);
  const ElementNode* const body = Find(envelope, {"Body", "RequestSecurityToken"});
  Require(TextOf(Find(body, {"DelegateTo", "UsernameToken", "Username"})) == texts.delegate);
  Require(TextOf(Find(body, {"Participants", "Participant", "EndpointReference", "Address"})) ==
          texts.audience);
  Require(AttributeOf(Find(body, {"AdviceSet", "Advice"}), "AdviceSource") == texts.source);
  const ElementNode* const attribute = Find(body, {"AdviceSet", "Advice", "Attribute"});
  Require(AttributeOf(attribute, "Name") == texts.name);
  Require(TextOf(Find(attribute, {"AttributeValue"})) == texts.value);
}

void CheckContinuation(const std::string& context, const std::string& leg) {
  const std::vector<unsigned char> bytes(leg.begin(), leg.end());
  Request request;
  try {
    RequestBuilderImpl(boost::none).BuildContinuedSPNegoRequest(context, bytes, request);
  } catch (const Pelmar::InvalidArgumentException&) {
    Require(!AreXmlTexts({context}));
    return;
  }
  const Pelmar::Ref<Pelmar::Xml::Document> document = Parse(request.body);
  const ElementNode* const body =
      Find(document->GetDocumentElement(), {"Body", "RequestSecurityTokenResponse"});
  Require(AttributeOf(body, "Context") == context);
  Require(Pelmar::StringUtil::Base64Decode(TextOf(Find(body, {"BinaryExchange"}))) == bytes);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string input(data, data + size);
  const Texts texts = ToTexts(Split(input));
  CheckIssue(texts);
  CheckContinuation(texts.context, input);
  return 0;
}
