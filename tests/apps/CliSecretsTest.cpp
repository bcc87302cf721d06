// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the tool leaves where others might look: core dumps, files, temporary files.

#include "apps/ChildProcess.h"
#include "apps/Cli.h"

#include "quorlin/CoreDumps.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>
#include <string>
#include <vector>

namespace {

using namespace StsTests;

[[noreturn]] void ForbidAndLook() {
  const bool isForbidden = Cli::ForbidCoreDumps();
  rlimit limit;
  limit.rlim_cur = limit.rlim_max = 1;
  getrlimit(RLIMIT_CORE, &limit);
  const bool isOff = limit.rlim_cur == 0 && limit.rlim_max == 0 && prctl(PR_GET_DUMPABLE, 0, 0, 0, 0) == 0;
  std::_Exit(isForbidden && isOff ? 0 : 1);
}

TEST(CoreDumpsDeathTest, AreForbidden) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(ForbidAndLook(), testing::ExitedWithCode(0), "");
}

TEST(CoreDumps, AreOffInEveryCommand) {
  ChildProcess sts(MakeCommand({"sts"}), ChildProcess::Terminal::NONE);
  sts.ReadUntil("\n");
  std::ifstream limits("/proc/" + std::to_string(sts.GetId()) + "/limits");
  std::string soft, hard;
  for (std::string line; std::getline(limits, line);) {
    constexpr const char* kName = "Max core file size";
    if (line.compare(0, std::strlen(kName), kName) == 0) {
      std::istringstream(line.substr(std::strlen(kName))) >> soft >> hard;
    }
  }
  EXPECT_EQ(soft, "0");
  EXPECT_EQ(hard, "0");
  sts.Signal(SIGTERM);
  sts.Wait();
}

/// The files below the folder, and who may do what with them.
std::map<std::string, unsigned> ReadModes(const std::string& folder) {
  std::map<std::string, unsigned> modes;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
    struct stat status;
    if (entry.is_regular_file() && stat(entry.path().c_str(), &status) == 0) {
      modes[entry.path().filename()] = status.st_mode & 07777;
    }
  }
  return modes;
}

/// Nothing is masked out: whatever a file may not be, its maker has to say.
class EverythingAllowed final {
 public:
  EverythingAllowed() : _before(umask(0)) {}
  EverythingAllowed(const EverythingAllowed&) = delete;
  EverythingAllowed& operator=(const EverythingAllowed&) = delete;
  ~EverythingAllowed() { umask(_before); }

 private:
  const mode_t _before;
};

TEST(CliFiles, OfTokensAreTheirOwnersOnlyWhateverTheMask) {
  const EverythingAllowed mask;
  const TestSupport::TemporaryDirectory files;
  const ServiceWithFiles& service = ServiceWithFiles::Shared();
  const std::string token = files.GetPath("token.xml");
  EXPECT_EQ(RunCli(service.MakeAcquire({"--out", token}), "secret").exitCode, 0);
  EXPECT_EQ(RunCli({"request", "password", "--user", "alice", "--password-stdin", "--reveal", "--out",
                    files.GetPath("request.xml")},
                   "secret")
                .exitCode,
            0);
  EXPECT_EQ(ReadModes(files.GetPath()),
            (std::map<std::string, unsigned>{{"request.xml", 0600}, {"token.xml", 0600}}));
}

TEST(CliFiles, OfCertificatesMayBeReadByAllAndWrittenByTheirOwner) {
  const EverythingAllowed mask;
  const TestSupport::TemporaryDirectory files;
  ChildProcess sts(MakeCommand({"sts", "--write-certs", files.GetPath()}), ChildProcess::Terminal::NONE);
  sts.ReadUntil("\n");
  EXPECT_EQ(ReadModes(files.GetPath()),
            (std::map<std::string, unsigned>{{"ca.pem", 0644}, {"server.pem", 0644}, {"sts.pem", 0644}}));
  sts.Signal(SIGTERM);
  EXPECT_EQ(sts.Wait(), 0);
}

TEST(CliFiles, ThatAreTemporaryStandInAFolderOfTheirOwners) {
  const EverythingAllowed mask;
  const TestSupport::TemporaryDirectory files;
  ChildProcess sts({"/usr/bin/env", "TMPDIR=" + files.GetPath(), MakeCommand({})[0], "sts"},
                   ChildProcess::Terminal::NONE);
  sts.ReadUntil("\n");
  std::vector<unsigned> modes;
  for (const auto& entry : std::filesystem::directory_iterator(files.GetPath())) {
    struct stat status;
    ASSERT_EQ(stat(entry.path().c_str(), &status), 0);
    modes.push_back(status.st_mode);
  }
  EXPECT_EQ(modes, std::vector<unsigned>{S_IFDIR | 0700});
  sts.Signal(SIGTERM);
  EXPECT_EQ(sts.Wait(), 0);
}

/// A token that cannot be written is not left behind in part, nor its temporary file.
TEST(CliFiles, AreNotLeftBehindWhenThereIsNoToken) {
  const TestSupport::TemporaryDirectory files;
  EXPECT_NE(
      RunCli(ServiceWithFiles::Shared().MakeAcquire({"--out", files.GetPath("token.xml")}), "wrong").exitCode,
      0);
  EXPECT_EQ(ReadModes(files.GetPath()), (std::map<std::string, unsigned>()));
}

}  // namespace
