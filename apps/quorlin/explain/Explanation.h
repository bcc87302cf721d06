// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The checks that a token goes through, one by one: which hold, which does not, which are not reached, and
// where in the text it is.

#ifndef QUORLIN_CLI_EXPLAIN_EXPLANATION_H
#define QUORLIN_CLI_EXPLAIN_EXPLANATION_H

#include "quorlin/Failure.h"
#include "quorlin/TokenOutput.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <list>
#include <optional>
#include <string>
#include <vector>

namespace Cli {

using Trust = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

enum class CheckState { NOT_REACHED, PASSED, FAILED };

/// A place in the text.
struct Place {
  std::string
      path;  ///< Element names from the assertion down, without prefixes, numbered where several have one.
  unsigned long line = 0;    ///< Counted from 1; 0: not known.
  unsigned long column = 0;  ///< In characters, counted from 1; 0: not known.
};

struct Check {
  std::string name;
  CheckState state = CheckState::NOT_REACHED;
  std::string finding;               ///< What was found: for a failure, the library's own message.
  std::vector<std::string> details;  ///< Further lines for people.
  Json data = Json::object();        ///< The details for programs.
  std::optional<Place> place;        ///< Of a failure.
  std::string advice;                ///< What to do about a failure.
};

struct Explanation {
  std::vector<Check> checks;
  /// The library's verdict on the same bytes: a token or a failure, never both. The checks only explain it.
  boost::shared_ptr<const Quorlin::SamlToken> token;
  std::optional<Failure> failure;
};

struct ExplainRequest {
  std::string xml;
  Trust trust;
  long long clockToleranceSec = 0;
  bool embedded = false;  ///< The token is the first assertion of a larger document.
};

/// Throws only what has nothing to do with the token (std::bad_alloc, say).
Explanation Explain(const ExplainRequest& request);

/// For people, in lines that end in line feeds.
std::string DescribeExplanation(const Explanation& explanation);
/// DescribeToken's or DescribeFailure's object with "checks" beside it.
Json ToJson(const Explanation& explanation);

}  // namespace Cli

#endif  // QUORLIN_CLI_EXPLAIN_EXPLANATION_H
