// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/security/Canonicalizer.h>

#include "pelmar/xml/CanonicalWalk.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

namespace Pelmar {
namespace Xml {
namespace Security {

Canonicalizer::~Canonicalizer() = default;

namespace {

class CanonicalizerImpl final : public Canonicalizer {
 public:
  explicit CanonicalizerImpl(const CanonicalForm& form) : _form(form) {}

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
bool FindForm(const std::string& algorithm, CanonicalForm& form) {
  const std::string inclusive(kC14n);
  const bool isInclusive = algorithm == inclusive || algorithm + "#" == inclusive;
  form.exclusive = algorithm == kExclusiveC14n || algorithm == kExclusiveC14nWithComments;
  form.withComments = algorithm == kC14nWithComments || algorithm == kExclusiveC14nWithComments;
  return isInclusive || form.exclusive || form.withComments;
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
  return MakeRef<CanonicalizerImpl>(form);
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
