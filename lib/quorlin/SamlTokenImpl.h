// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The token behind the SamlToken interface: built in one go from an assertion that passed every check, then
// only read.

#ifndef QUORLIN_SAMLTOKENIMPL_H
#define QUORLIN_SAMLTOKENIMPL_H

#include "quorlin/SamlAssertionType.h"

#include <pelmar/xml/security/KeyInfoResolver.h>
#include <quorlin/SamlToken.h>

#include <boost/scoped_ptr.hpp>

namespace Quorlin {

class SamlTokenImpl final : public SamlToken {
 public:
  /// From the text of an assertion document.
  SamlTokenImpl(const std::string& xml, const Pelmar::Xml::Security::KeyInfoResolver* resolver,
                long long clockToleranceSec);
  /// From an assertion element of some tree.
  SamlTokenImpl(Pelmar::Xml::ElementNode* element, const Pelmar::Xml::Security::KeyInfoResolver* resolver,
                long long clockToleranceSec);

  const std::string& GetId() const override;
  const Pelmar::System::DateTime& GetStartDate() const override;
  const Pelmar::System::DateTime& GetEndDate() const override;
  const PrincipalId& GetSubject() const override;
  bool IsRenewable() const override;
  bool IsDelegable() const override;
  bool IsSolution() const override;
  ConfirmationType GetConfirmationMethod() const override;
  void GetFullName(std::pair<std::string, std::string>& fullName) const override;
  void GetGroups(std::vector<PrincipalId>& groups) const override;
  void GetDelegationChain(std::vector<Delegate>& delegationChain) const override;
  void GetAudience(std::set<std::string>& audience) const override;
  void GetAdvice(std::vector<Advice>& advice) const override;
  const Pelmar::Crypto::Certificate* GetConfirmationCertificate() const override;
  const std::string& ToXml() const override;

 private:
  void InitializeFromDom(Pelmar::Xml::ElementNode* assertion,
                         const Pelmar::Xml::Security::KeyInfoResolver* resolver, long long clockToleranceSec);
  void ValidateSignature(const Pelmar::Xml::Security::Signature* signature,
                         const Pelmar::Xml::Security::KeyInfoResolver* resolver) const;
  void PopulateFrom(const SamlAssertionType& assertion);
  void PopulateTokenAttribute(const AttributeType& attribute);

  std::string _xml;
  std::string _id;
  Pelmar::System::DateTime _startDate;
  Pelmar::System::DateTime _endDate;
  boost::scoped_ptr<PrincipalId> _subject;
  bool _renewable = false;
  bool _delegable = false;
  bool _isSolution = false;
  std::pair<std::string, std::string> _fullName;
  std::vector<PrincipalId> _groups;
  std::vector<Delegate> _delegationChain;
  std::set<std::string> _audience;
  std::vector<Advice> _advice;
  ConfirmationType _confirmationMethod = CONFIRM_BEARER;
  Pelmar::Ref<const Pelmar::Crypto::Certificate> _confirmationCertificate;
};

}  // namespace Quorlin

#endif  // QUORLIN_SAMLTOKENIMPL_H
