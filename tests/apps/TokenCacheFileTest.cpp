// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The file of quorlin get-token: what it takes, what it refuses, and what a sudden end leaves.

#include "quorlin/TokenCacheFile.h"

#include "quorlin/Failure.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

using Cli::CachedToken;
using Cli::TokenCacheFile;
using Step = TokenCacheFile::Step;

const std::string kPurpose(64, 'a');
const std::string kOtherPurpose = std::string(63, '0') + "f";

/// A folder with a cache "c" in it.
class Folder final {
 public:
  std::string GetPath() const { return _files.GetPath("c"); }

  void Put(const CachedToken& token) const {
    TokenCacheFile cache(GetPath());
    cache.Lock();
    cache.Replace(token);
  }

  /// The XML that is kept, "nothing", or why it is refused.
  std::string Get() const {
    try {
      const std::optional<CachedToken> token = TokenCacheFile(GetPath()).Read();
      return token ? token->xml : "nothing";
    } catch (const Cli::UsageException& error) {
      return Mask(error.what());
    }
  }

  /// What `Lock` says.
  std::string Lock() const {
    try {
      TokenCacheFile(GetPath()).Lock();
      return "locked";
    } catch (const Cli::UsageException& error) {
      return Mask(error.what());
    }
  }

  void WriteRaw(const std::string& text, mode_t mode = 0600) const {
    _files.WriteFile("c", text);
    EXPECT_EQ(chmod(GetPath().c_str(), mode), 0);
  }

  /// The names in the folder, sorted.
  std::vector<std::string> List() const {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(_files.GetPath())) {
      names.push_back(entry.path().filename().string());
    }
    std::sort(names.begin(), names.end());
    return names;
  }

  const TestSupport::TemporaryDirectory& GetFiles() const { return _files; }

 private:
  std::string Mask(const std::string& text) const {
    const std::size_t at = text.find(_files.GetPath());
    return at == std::string::npos ? text
                                   : text.substr(0, at) + "DIR" + text.substr(at + _files.GetPath().size());
  }

  TestSupport::TemporaryDirectory _files;
};

TEST(TokenCacheFile, IsEmptyAtFirst) {
  EXPECT_EQ(Folder().Get(), "nothing");
}

TEST(TokenCacheFile, GivesBackWhatWasPutIn) {
  const Folder folder;
  folder.Put({"<a>\n<!-- quorlin get-token -->\n</a>\n", kPurpose});
  const std::optional<CachedToken> token = TokenCacheFile(folder.GetPath()).Read();
  ASSERT_TRUE(token);
  EXPECT_EQ(token->xml, "<a>\n<!-- quorlin get-token -->\n</a>\n");
  EXPECT_EQ(token->purpose, kPurpose);
}

TEST(TokenCacheFile, IsTheTokenAndAComment) {
  const Folder folder;
  folder.Put({"<a/>", kOtherPurpose});
  EXPECT_EQ(folder.GetFiles().ReadFile("c"), "<a/>\n<!-- quorlin get-token " + kOtherPurpose + " -->\n");
}

TEST(TokenCacheFile, BelongsToItsOwnerAlone) {
  const Folder folder;
  folder.Put({"<a/>", kPurpose});
  for (const char* name : {"c", "c.lock"}) {
    struct stat status;
    ASSERT_EQ(stat(folder.GetFiles().GetPath(name).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0600U) << name;
  }
  EXPECT_EQ(folder.List(), (std::vector<std::string>{"c", "c.lock"}));
}

TEST(TokenCacheFile, IsReplacedWhole) {
  const Folder folder;
  folder.Put({"<a>" + std::string(100000, 'x') + "</a>", kPurpose});
  folder.Put({"<b/>", kPurpose});
  EXPECT_EQ(folder.Get(), "<b/>");
}

// ---- What is refused ----

class TokenCacheModes : public testing::TestWithParam<mode_t> {};

TEST_P(TokenCacheModes, ThatGrantOthersAnythingAreRefused) {
  const Folder folder;
  folder.Put({"<a/>", kPurpose});
  ASSERT_EQ(chmod(folder.GetPath().c_str(), GetParam()), 0);
  EXPECT_EQ(folder.Get(), "cannot use DIR/c: others may use it; chmod 600 makes it yours alone");
}

INSTANTIATE_TEST_SUITE_P(All, TokenCacheModes,
                         testing::Values(0640, 0620, 0610, 0604, 0602, 0601, 0700, 04600));

TEST(TokenCacheFile, MayBeReadOnly) {
  const Folder folder;
  folder.Put({"<a/>", kPurpose});
  ASSERT_EQ(chmod(folder.GetPath().c_str(), 0400), 0);
  EXPECT_EQ(folder.Get(), "<a/>");
}

TEST(TokenCacheFile, RefusesASymbolicLink) {
  const Folder folder;
  folder.Put({"<a/>", kPurpose});
  std::filesystem::rename(folder.GetPath(), folder.GetFiles().GetPath("d"));
  std::filesystem::create_symlink("d", folder.GetPath());
  EXPECT_EQ(folder.Get(), "cannot use DIR/c: it is a symbolic link");
}

TEST(TokenCacheFile, RefusesALockThatIsASymbolicLink) {
  const Folder folder;
  std::filesystem::create_symlink("d", folder.GetPath() + ".lock");
  EXPECT_EQ(folder.Lock(), "cannot use DIR/c.lock: it is a symbolic link");
  EXPECT_EQ(folder.List(), (std::vector<std::string>{"c.lock"}));
}

TEST(TokenCacheFile, RefusesAFolderAndAPipe) {
  const Folder folder;
  std::filesystem::create_directory(folder.GetPath());
  EXPECT_EQ(folder.Get(), "cannot use DIR/c: it is no regular file");
  std::filesystem::remove(folder.GetPath());
  ASSERT_EQ(mkfifo(folder.GetPath().c_str(), 0600), 0);
  EXPECT_EQ(folder.Get(), "cannot use DIR/c: it is no regular file");
}

TEST(TokenCacheFile, RefusesTheFileOfAnotherUser) {
  const Folder folder;
  folder.Put({"<a/>", kPurpose});
  constexpr uid_t kAnother = 65534;
  if (chown(folder.GetPath().c_str(), kAnother, static_cast<gid_t>(-1)) != 0) {
    GTEST_SKIP() << "only root can give a file to another user";
  }
  EXPECT_EQ(folder.Get(), "cannot use DIR/c: it belongs to another user");
}

TEST(TokenCacheFile, RefusesWhatIsNoCache) {
  const Folder folder;
  const std::string refusal = "cannot use DIR/c: it is no token cache";
  for (const std::string& text : {std::string(), std::string("dear"), std::string(1000, 'x'),
                                  "<a/>\n<!-- quorlin get-token " + kPurpose + " -->",
                                  "<a/>\n<!-- quorlin get-token " + kPurpose + " -->\n\n",
                                  "\n<!-- quorlin get-token " + kPurpose + " -->\n",
                                  "<a/>\n<!-- quorlin get-token " + std::string(64, 'G') + " -->\n",
                                  "<a/>\n<!-- quorlin get-token " + std::string(63, 'a') + " -->\n"}) {
    folder.WriteRaw(text);
    EXPECT_EQ(folder.Get(), refusal) << text;
    EXPECT_EQ(folder.GetFiles().ReadFile("c"), text);
  }
}

TEST(TokenCacheFile, SaysWhyItCannotBeWritten) {
  const TestSupport::TemporaryDirectory files;
  TokenCacheFile cache(files.GetPath("none/c"));
  try {
    cache.Lock();
    FAIL() << "locked what is not there";
  } catch (const Cli::UsageException& error) {
    EXPECT_EQ(error.what(), "cannot use " + files.GetPath("none/c.lock") + ": No such file or directory");
  }
}

// ---- A sudden end ----

/// A child process replaces the token and is killed at this step.
void ReplaceUntil(const Folder& folder, Step end, const CachedToken& token) {
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    TokenCacheFile cache(folder.GetPath(), [end](Step step) {
      if (step == end) {
        raise(SIGKILL);
      }
    });
    cache.Lock();
    cache.Replace(token);
    _exit(0);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_TRUE(WIFSIGNALED(status)) << status;
  ASSERT_EQ(WTERMSIG(status), SIGKILL);
}

struct EndCase {
  Step step;
  bool isNew;
};

class TokenCacheEnds : public testing::TestWithParam<EndCase> {};

TEST_P(TokenCacheEnds, LeaveTheOldOrTheNewTokenAndARunThatGoesOn) {
  const Folder folder;
  const std::string oldXml = "<old>" + std::string(100000, 'o') + "</old>";
  const std::string newXml = "<new>" + std::string(100000, 'n') + "</new>";
  folder.Put({oldXml, kPurpose});
  ReplaceUntil(folder, GetParam().step, {newXml, kPurpose});
  EXPECT_EQ(folder.Get(), GetParam().isNew ? newXml : oldXml);
  folder.Put({"<next/>", kPurpose});
  EXPECT_EQ(folder.Get(), "<next/>");
  EXPECT_EQ(folder.List(), (std::vector<std::string>{"c", "c.lock"}));
}

TEST_P(TokenCacheEnds, LeaveNothingOrTheNewTokenWhereThereWasNone) {
  const Folder folder;
  ReplaceUntil(folder, GetParam().step, {"<new/>", kPurpose});
  EXPECT_EQ(folder.Get(), GetParam().isNew ? "<new/>" : "nothing");
}

INSTANTIATE_TEST_SUITE_P(All, TokenCacheEnds,
                         testing::Values(EndCase{Step::CREATED, false}, EndCase{Step::HALF_WRITTEN, false},
                                         EndCase{Step::WRITTEN, false}, EndCase{Step::SYNCED, false},
                                         EndCase{Step::RENAMED, true},
                                         EndCase{Step::DIRECTORY_SYNCED, true}));

// What survives the loss of power hangs on this order: the content is on the disk before the name leads to
// it.
TEST(TokenCacheFile, BringsTheContentToTheDiskBeforeTheName) {
  const Folder folder;
  std::vector<Step> steps;
  TokenCacheFile cache(folder.GetPath(), [&steps](Step step) { steps.push_back(step); });
  cache.Lock();
  cache.Replace({"<a/>", kPurpose});
  EXPECT_EQ(steps, (std::vector<Step>{Step::CREATED, Step::HALF_WRITTEN, Step::WRITTEN, Step::SYNCED,
                                      Step::RENAMED, Step::DIRECTORY_SYNCED}));
}

TEST(TokenCacheFile, LeavesTheOldTokenWhenTheNewOneCannotTakeItsPlace) {
  const Folder folder;
  TokenCacheFile cache(folder.GetPath(), [&folder](Step step) {
    if (step == Step::SYNCED) {
      std::filesystem::create_directory(folder.GetPath());
    }
  });
  cache.Lock();
  EXPECT_THROW(cache.Replace({"<a/>", kPurpose}), Cli::UsageException);
  EXPECT_EQ(folder.List(), (std::vector<std::string>{"c", "c.lock"}));
}

}  // namespace
