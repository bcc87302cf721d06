// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/security/Canonicalizer.h>

#include "pelmar/xml/CanonicalWalk.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <string_view>
#include <utility>

namespace Pelmar {
namespace Xml {
namespace Security {

Canonicalizer::~Canonicalizer() = default;

namespace {

class CanonicalizerImpl final : public Canonicalizer {
 public:
  explicit CanonicalizerImpl(CanonicalForm form) : _form(std::move(form)) {}

  void Canonicalize(const Node* node, Writer* writer, const Node* omitted) const override {
    if (node == nullptr) {
      return;
    }
    if (writer == nullptr) {
      throw InvalidArgumentException("the writer is null");
    }
    CanonicalWalk(_form, writer, omitted).Write(node);
  }

 private:
  const CanonicalForm _form;
};

// Inclusive canonical XML is written with and without the final "#".
bool IsInclusive(std::string_view algorithm) noexcept {
  constexpr std::string_view kInclusive = kC14n;
  return algorithm == kInclusive || algorithm == kInclusive.substr(0, kInclusive.size() - 1);
}

bool FindForm(const std::string& algorithm, CanonicalForm& form) {
  form.exclusive = algorithm == kExclusiveC14n || algorithm == kExclusiveC14nWithComments;
  form.withComments = algorithm == kC14nWithComments || algorithm == kExclusiveC14nWithComments;
  return form.exclusive || form.withComments || IsInclusive(algorithm);
}

}  // namespace

Ref<Canonicalizer> CreateCanonicalizer(const std::string& algorithm) {
  return CreateCanonicalizer(algorithm, std::vector<std::string>());
}

Ref<Canonicalizer> CreateCanonicalizer(const std::string& algorithm,
                                       const std::vector<std::string>& inclusivePrefixes) {
  CanonicalForm form;
  if (!FindForm(algorithm, form)) {
    throw XmlSecurityException("Unknown canonicalization algorithm '" + algorithm + "'");
  }
  if (!form.exclusive && !inclusivePrefixes.empty()) {
    throw XmlSecurityException("Canonicalization algorithm '" + algorithm + "' takes no prefix list");
  }
  for (const std::string& prefix : inclusivePrefixes) {
    form.inclusivePrefixes.push_back(prefix == "#default" ? std::string() : prefix);
  }
  return MakeRef<CanonicalizerImpl>(std::move(form));
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
