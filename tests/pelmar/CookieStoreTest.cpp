// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/CookieStoreImpl.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using Pelmar::MakeRef;
using Pelmar::Ref;
using Pelmar::Http::CookieStoreImpl;
using Pelmar::Http::kMaxCookies;

using Lines = std::vector<std::string>;

std::string MakeLine(const std::string& name, const std::string& value, const std::string& path = "/",
                     const std::string& domain = "host") {
  return domain + "\tFALSE\t" + path + "\tFALSE\t0\t" + name + "\t" + value;
}

TEST(CookieStore, TakesNewCookiesInOrder) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  store->Merge({}, {MakeLine("a", "1"), MakeLine("b", "2")});
  EXPECT_EQ((Lines{MakeLine("a", "1"), MakeLine("b", "2")}), store->GetLines());
}

TEST(CookieStore, ReplacesInPlace) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  const Lines before = {MakeLine("a", "1"), MakeLine("b", "2")};
  store->Merge({}, before);
  store->Merge(before, {MakeLine("b", "2"), MakeLine("a", "3")});
  EXPECT_EQ((Lines{MakeLine("a", "3"), MakeLine("b", "2")}), store->GetLines());
}

TEST(CookieStore, TakesNameDomainAndPathForTheCookie) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  const Lines all = {MakeLine("a", "1"), MakeLine("a", "2", "/x"), MakeLine("a", "3", "/", "other"),
                     MakeLine("A", "4"), MakeLine("a", "5", "/", "most")};
  store->Merge({}, all);
  EXPECT_EQ(all, store->GetLines());
}

TEST(CookieStore, SeesTheSameDomainBehindMarks) {
  for (const std::string domain : {"#HttpOnly_host", ".host", "#HttpOnly_.host"}) {
    const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
    const Lines before = {MakeLine("a", "1"), MakeLine("b", "1")};
    store->Merge({}, before);
    const std::string changed = MakeLine("a", "2", "/", domain);
    store->Merge(before, {before[1], changed});
    EXPECT_EQ((Lines{changed, before[1]}), store->GetLines()) << domain;
  }
}

TEST(CookieStore, RemovesWhatTheExchangeRemoved) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  const Lines before = {MakeLine("a", "1"), MakeLine("b", "2")};
  store->Merge({}, before);
  store->Merge(before, {MakeLine("b", "2")});
  EXPECT_EQ((Lines{MakeLine("b", "2")}), store->GetLines());
}

TEST(CookieStore, KeepsWhatAnotherExchangeBroughtMeanwhile) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  store->Merge({}, {MakeLine("a", "1")});
  store->Merge({}, {MakeLine("b", "2")});
  EXPECT_EQ((Lines{MakeLine("a", "1"), MakeLine("b", "2")}), store->GetLines());
}

TEST(CookieStore, KeepsWhatAnotherExchangeChangedMeanwhile) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  const Lines before = {MakeLine("a", "1")};
  store->Merge({}, before);
  const Lines changed = {MakeLine("a", "2")};
  store->Merge(before, changed);
  // Began before that, and was given no cookie.
  store->Merge(before, before);
  EXPECT_EQ(changed, store->GetLines());
}

TEST(CookieStore, ForgetsTheOldestBeyondTheBound) {
  const Ref<CookieStoreImpl> store = MakeRef<CookieStoreImpl>();
  Lines lines;
  for (std::size_t i = 0; i <= kMaxCookies; ++i) {
    lines.push_back(MakeLine("c" + std::to_string(i), "v"));
  }
  store->Merge({}, lines);
  EXPECT_EQ(Lines(lines.begin() + 1, lines.end()), store->GetLines());
}

}  // namespace
