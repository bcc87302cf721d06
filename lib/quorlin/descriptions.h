// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One-line descriptions for log lines. Operators' tools parse them: every blank and bracket, odd ones
// included, is part of the format.
//
// A token's description is redacted: no id, audience, advice, certificate or XML. Building one walks the
// whole token, so ask the logger first.

#ifndef QUORLIN_DESCRIPTIONS_H
#define QUORLIN_DESCRIPTIONS_H

#include <quorlin/PrincipalId.h>
#include <quorlin/SamlToken.h>
#include <quorlin/TokenSpec.h>

#include <boost/function.hpp>

#include <string>
#include <vector>

namespace Quorlin {

/// "SamlToken [subject=..., groups=[...], ..., isSolution=...,confirmationType=0]": no blank before
/// "confirmationType".
std::string CreateRedactedDescription(const SamlToken& token);

/// "TokenSpec [tokenLifetimeSec=..., ..., confirmationType=0,audienceRestriction=..., advice=[...]": no blank
/// before "audienceRestriction", and the first bracket stays open.
std::string WriteTokenSpec(const TokenSpec& spec);

/// "Advice [source=..., attributes=[...]]".
std::string WriteAdvice(const Advice* advice);

/// "[source=..., attributes=[...]]": the attribute's name goes by the label "source" too.
std::string WriteAdviceAttribute(const AdviceAttribute* attribute);

/// "{Name: ...; Domain:...} at <date>".
std::string WriteDelegate(const Delegate* delegate);

/// What `write` makes of each item, with ", " before each but where nothing was written yet: items that are
/// written as the empty text leave no separator at the front.
template <typename T>
std::string AsString(const std::vector<T>& items, const boost::function<std::string(const T*)>& write) {
  std::string text;
  for (const T& item : items) {
    if (!text.empty()) {
      text += ", ";
    }
    text += write(&item);
  }
  return text;
}

}  // namespace Quorlin

#endif  // QUORLIN_DESCRIPTIONS_H
