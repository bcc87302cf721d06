// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin doctor, and the texts that it prints.

#ifndef QUORLIN_TESTS_APPS_DOCTOR_H
#define QUORLIN_TESTS_APPS_DOCTOR_H

#include "support/Process.h"

#include <string>
#include <vector>

namespace StsTests {

/// Runs "doctor" with these arguments.
TestSupport::ProcessResult RunDoctor(const std::vector<std::string>& arguments);

/// `text` with every running time as "TIME" and every date as "DATE".
std::string MaskTimes(const std::string& text);

/// The line of a step, masked: "  tcp          passed       connected to ... (TIME)\n".
std::string StepLine(const std::string& name, const std::string& status, const std::string& found);

/// A line below it.
std::string DetailLine(const std::string& text);

/// The lines of the steps after `name`, none of which was reached.
std::string StepsNotReachedAfter(const std::string& name);

/// The lines of the first steps for a service at 127.0.0.1 `port`.
std::string NameLine();
std::string TcpLine(int port);
std::string PlainLine();

/// The lines of the last two steps when nothing was asked of them.
std::string UnaskedLines();

/// What is printed in the end when `step` failed.
std::string FailureText(const std::string& step, const std::string& advice);

}  // namespace StsTests

#endif  // QUORLIN_TESTS_APPS_DOCTOR_H
