// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A ds:Reference, read or in the making.

#ifndef PELMAR_XML_SIGNATUREREFERENCEIMPL_H
#define PELMAR_XML_SIGNATUREREFERENCEIMPL_H

#include <pelmar/xml/security/Signature.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

class SignatureReferenceImpl final : public SignatureReference {
 public:
  SignatureReferenceImpl(const std::string& uri, const std::string& digestMethod)
      : _uri(uri), _digestMethod(digestMethod) {}

  const std::string& GetUri() const override { return _uri; }
  const std::string& GetDigestMethod() const override { return _digestMethod; }
  const std::vector<std::string>& GetTransforms() const override { return _transforms; }
  void AddTransform(const std::string& algorithm) override;

  /// From now on the reference stays as it is, and has `transforms`, whether acceptable or not.
  void Close(const std::vector<std::string>& transforms);

 private:
  ~SignatureReferenceImpl() override;

  const std::string _uri;
  const std::string _digestMethod;
  std::vector<std::string> _transforms;
  bool _closed = false;
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREREFERENCEIMPL_H
