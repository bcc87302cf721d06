// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Answers of a hostile service: the four response handlers over arbitrary bytes. Whatever comes, only the
// platform's exceptions may leave them, and a token's text must be a document in canonical form, since its
// signature is checked in that very text.

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/Verify.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "quorlin/ResponseHandlerImpl.h"
#include "quorlin/xmlReading.h"

namespace {

constexpr const char* kSource = "fuzz/ResponseHandlerFuzz";

void RequireCanonicalDocument(const std::string& token) {
  Pelmar::Ref<Pelmar::Xml::Document> document;
  Quorlin::ParseXML(token, document);
  const Pelmar::Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  Pelmar::Xml::Security::CreateCanonicalizer(Pelmar::Xml::Security::kC14n)
      ->Canonicalize(document->GetDocumentElement(), writer.Get());
  Pelmar::Verify(writer->GetText() == token, "writer->GetText() == token", kSource);
}

// True when `handle` did not refuse the bytes.
template <typename Handle>
bool Accepts(const std::string& bytes, const Handle& handle) {
  try {
    handle(Pelmar::CreateStringReader(bytes).Get());
    return true;
  } catch (const Pelmar::Exception&) {
    return false;
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string bytes(reinterpret_cast<const char*>(data), size);
  const Quorlin::ResponseHandlerImpl handler;

  std::string issued;
  if (Accepts(bytes,
              [&](Pelmar::Reader* response) { handler.HandleAcquireTokenResponse(response, issued); })) {
    RequireCanonicalDocument(issued);
  }
  std::string renewed;
  if (Accepts(bytes,
              [&](Pelmar::Reader* response) { handler.HandleRenewTokenResponse(response, renewed); })) {
    RequireCanonicalDocument(renewed);
  }
  Accepts(bytes, [&](Pelmar::Reader* response) { handler.HandleValidateSubjectResponse(response); });
  Quorlin::SPNegoResponse round;
  const bool isRound =
      Accepts(bytes, [&](Pelmar::Reader* response) { handler.HandleSPNegoResponse(response, round); });
  if (isRound && !round.token.empty()) {
    RequireCanonicalDocument(round.token);
  }
  Pelmar::Verify(isRound || round.contextId.empty(), "isRound || round.contextId.empty()", kSource);
  return 0;
}
