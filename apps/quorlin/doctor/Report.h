// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the doctor says.

#ifndef QUORLIN_CLI_DOCTOR_REPORT_H
#define QUORLIN_CLI_DOCTOR_REPORT_H

#include "quorlin/doctor/Examination.h"

#include <string>
#include <vector>

namespace Cli {
namespace Doctor {

/// A step that was gone through or not reached.
struct Result {
  std::string name;
  Outcome outcome;
  double seconds;
};

/// The step's line, and below it its details. Printable.
std::string PrintResult(const Result& result);

/// What all came to and what to do, in lines. Printable.
std::string PrintConclusion(const std::vector<Result>& results);

/// {"url":...,"passed":...,"steps":[{"name":...,"status":...,"found":...,"seconds":...,"data":{...}},...]},
/// with "details" and "advice" where there are some.
Json DescribeResults(const std::string& url, const std::vector<Result>& results);

/// That of the step that failed; EXIT_DONE when none did.
ExitCode GetExitCode(const std::vector<Result>& results);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_REPORT_H
