// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "apps/Doctor.h"

#include "apps/Cli.h"

#include <algorithm>
#include <regex>

namespace StsTests {

namespace {

const std::vector<std::string> kSteps = {"name", "tcp",   "tls",         "http",
                                         "soap", "clock", "certificate", "kerberos"};

std::string Pad(const std::string& text) {
  return text + std::string(13 - text.size(), ' ');
}

}  // namespace

TestSupport::ProcessResult RunDoctor(const std::vector<std::string>& arguments) {
  std::vector<std::string> all = {"doctor"};
  all.insert(all.end(), arguments.begin(), arguments.end());
  return RunCli(all);
}

std::string MaskTimes(const std::string& text) {
  static const std::regex kTime("\\([0-9]+ ms\\)|\\([0-9]+\\.[0-9] s\\)");
  static const std::regex kDate("[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9:.]+Z");
  return std::regex_replace(std::regex_replace(text, kTime, "(TIME)"), kDate, "DATE");
}

std::string StepLine(const std::string& name, const std::string& status, const std::string& found) {
  return "  " + Pad(name) + Pad(status) + found + (status == "skipped" ? "\n" : " (TIME)\n");
}

std::string DetailLine(const std::string& text) {
  return std::string(28, ' ') + text + "\n";
}

std::string StepsNotReachedAfter(const std::string& name) {
  std::string lines;
  for (auto step = std::find(kSteps.begin(), kSteps.end(), name) + 1; step != kSteps.end(); ++step) {
    lines += "  " + Pad(*step) + "not reached\n";
  }
  return lines;
}

std::string NameLine() {
  return StepLine("name", "passed", "127.0.0.1 is an address");
}

std::string TcpLine(int port) {
  return StepLine("tcp", "passed", "connected to 127.0.0.1:" + std::to_string(port));
}

std::string PlainLine() {
  return StepLine("tls", "skipped", "the URL is http:, so nothing hides what is sent");
}

std::string UnaskedLines() {
  return StepLine("certificate", "skipped", "--cert and --key were not given") +
         StepLine("kerberos", "skipped", "--gss was not given");
}

std::string FailureText(const std::string& step, const std::string& advice) {
  return "\nThe check of " + step + " failed.\nWhat to do (" + step + "): " + advice + "\n";
}

}  // namespace StsTests
