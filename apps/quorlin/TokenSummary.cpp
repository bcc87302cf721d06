// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens for people.

#include "quorlin/TokenOutput.h"

#include "quorlin/Terminal.h"

#include <pelmar/crypto/Digest.h>

#include <algorithm>
#include <set>
#include <utility>
#include <vector>

namespace Cli {

namespace {

constexpr std::size_t kLabelWidth = 14;

std::string MakeLine(const std::string& label, const std::string& value) {
  return "  " + label + std::string(kLabelWidth - std::min(kLabelWidth, label.size()), ' ') + value + "\n";
}

/// No line when there is nothing to say.
std::string MakeLineUnlessEmpty(const std::string& label, const std::string& value) {
  return value.empty() ? "" : MakeLine(label, value);
}

/// One line per value, the label on the first.
std::string MakeLines(std::string label, const std::vector<std::string>& values) {
  std::string lines;
  for (const std::string& value : values) {
    lines += MakeLine(label, value);
    label.clear();
  }
  return lines;
}

std::string ToText(const Quorlin::PrincipalId& principal) {
  return MakePrintable(principal.name + "@" + principal.domain);
}

std::string SummarizeFullName(const Quorlin::SamlToken& token) {
  std::pair<std::string, std::string> fullName;
  token.GetFullName(fullName);
  const bool needsBlank = !fullName.first.empty() && !fullName.second.empty();
  return MakeLineUnlessEmpty("full name",
                             MakePrintable(fullName.first + (needsBlank ? " " : "") + fullName.second));
}

std::string SummarizeGroups(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::PrincipalId> groups;
  token.GetGroups(groups);
  std::vector<std::string> lines;
  for (const Quorlin::PrincipalId& group : groups) {
    lines.push_back(ToText(group));
  }
  return groups.empty() ? MakeLine("groups", "none") : MakeLines("groups", lines);
}

std::string SummarizeValidity(const Quorlin::SamlToken& token, const Pelmar::System::DateTime& now) {
  const long long start = token.GetStartDate().GetUtcTime();
  const long long end = token.GetEndDate().GetUtcTime();
  std::string note = "(" + DescribeSpan(end - now.GetUtcTime()) + " left)";
  if (now.GetUtcTime() < start) {
    note = "(starts in " + DescribeSpan(start - now.GetUtcTime()) + ")";
  } else if (now.GetUtcTime() >= end) {
    note = "(ended " + DescribeSpan(now.GetUtcTime() - end) + " ago)";
  }
  return MakeLine("valid from", token.GetStartDate().ToString()) +
         MakeLine("valid until", token.GetEndDate().ToString() + " " + note);
}

std::string SummarizeFlags(const Quorlin::SamlToken& token) {
  return MakeLine("flags", std::string(token.IsRenewable() ? "renewable" : "not renewable") +
                               (token.IsDelegable() ? ", delegable" : ", not delegable") +
                               (token.IsSolution() ? ", service account" : ""));
}

std::string SummarizeConfirmation(const Quorlin::SamlToken& token) {
  const Pelmar::Crypto::Certificate* const certificate = token.GetConfirmationCertificate();
  if (token.GetConfirmationMethod() == Quorlin::SamlToken::CONFIRM_BEARER || certificate == nullptr) {
    return MakeLine("confirmation", "bearer: whoever holds it may use it");
  }
  return MakeLine("confirmation",
                  "holder-of-key: needs the key of " + MakePrintable(certificate->GetSubject())) +
         MakeLine("", "certificate SHA-256 " + Pelmar::Crypto::ToHex(certificate->GetSha256()));
}

std::string SummarizeDelegation(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::Delegate> chain;
  token.GetDelegationChain(chain);
  std::vector<std::string> lines;
  for (const Quorlin::Delegate& link : chain) {
    lines.push_back(ToText(link.principal) + " since " + link.delegationInstant.ToString());
  }
  return MakeLines("delegated to", lines);
}

std::string SummarizeAudience(const Quorlin::SamlToken& token) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  std::vector<std::string> lines;
  for (const std::string& address : audience) {
    lines.push_back(MakePrintable(address));
  }
  return MakeLines("audience", lines);
}

std::string SummarizeAdvice(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::Advice> advices;
  token.GetAdvice(advices);
  std::vector<std::string> lines;
  for (const Quorlin::Advice& advice : advices) {
    for (const Quorlin::AdviceAttribute& attribute : advice.attributes) {
      std::string line = MakePrintable(advice.source) + ": " + MakePrintable(attribute.name);
      for (std::size_t i = 0; i < attribute.values.size(); ++i) {
        line += (i == 0 ? " = " : ", ") + MakePrintable(attribute.values[i]);
      }
      lines.push_back(line);
    }
  }
  return MakeLines("advice", lines);
}

}  // namespace

std::string SummarizeToken(const Quorlin::SamlToken& token, const Pelmar::System::DateTime& now) {
  return MakeLine("subject", ToText(token.GetSubject())) + SummarizeFullName(token) + SummarizeGroups(token) +
         SummarizeValidity(token, now) + SummarizeFlags(token) + SummarizeConfirmation(token) +
         SummarizeDelegation(token) + SummarizeAudience(token) + SummarizeAdvice(token) +
         MakeLine("id", MakePrintable(token.GetId()));
}

}  // namespace Cli
