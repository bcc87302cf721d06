// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ResponseHead.h"

#include <pelmar/http/Client.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using Pelmar::Http::HeadFault;
using Pelmar::Http::kMaxResponseHeaderBytes;
using Pelmar::Http::ResponseHead;

HeadFault TakeAll(ResponseHead& head, const std::vector<std::string>& lines) {
  HeadFault fault = HeadFault::NONE;
  for (const std::string& line : lines) {
    fault = head.TakeLine(line.data(), line.size());
  }
  return fault;
}

HeadFault Judge(const std::vector<std::string>& lines) {
  ResponseHead head;
  return TakeAll(head, lines);
}

TEST(ResponseHead, KnowsNothingBeforeTheFirstLine) {
  const ResponseHead head;
  EXPECT_FALSE(head.HasStarted());
  EXPECT_FALSE(head.IsComplete());
  EXPECT_EQ(0, head.GetStatusCode());
  EXPECT_EQ("", head.GetReason());
}

TEST(ResponseHead, IsCompleteAfterTheEmptyLineOfTheFinalResponse) {
  ResponseHead head;
  TakeAll(head, {"HTTP/1.1 103 Early Hints\r\n", "Link: x\r\n", "\r\n"});
  EXPECT_TRUE(head.HasStarted());
  EXPECT_FALSE(head.IsComplete());
  TakeAll(head, {"HTTP/1.1 404 Not Found\r\n", "A: b\r\n"});
  EXPECT_FALSE(head.IsComplete());
  TakeAll(head, {"\r\n"});
  EXPECT_TRUE(head.IsComplete());
  EXPECT_EQ(404, head.GetStatusCode());
  EXPECT_EQ("Not Found", head.GetReason());
}

TEST(ResponseHead, TakesNoStatusFromHeadersAndTrailers) {
  ResponseHead head;
  EXPECT_EQ(HeadFault::NONE, TakeAll(head, {"HTTP/1.1 200 OK\r\n", "HTTP/1.1 500 No\r\n", "\r\n",
                                            "HTTP/1.1 404 No\r\n", "\r\n", "Content-Encoding: gzip\r\n"}));
  EXPECT_EQ(200, head.GetStatusCode());
  EXPECT_EQ("OK", head.GetReason());
}

TEST(ResponseHead, RefusesOtherVersionsAndBadCodes) {
  for (const char* const line :
       {"HTTP/2 200 OK\r\n", "HTTP/2.0 200 OK\r\n", "HTTP/0.9 200 OK\r\n", "HTTP/1.1\r\n", "HTTP/1.1 20\r\n",
        "HTTP/1.1 2x0 OK\r\n", "HTTP/1.1  200 OK\r\n", "HTTP/\r\n"}) {
    EXPECT_EQ(HeadFault::NOT_HTTP_1, Judge({line})) << line;
  }
}

TEST(ResponseHead, RefusesCodingsOfTheFinalResponseOnly) {
  EXPECT_EQ(HeadFault::NONE, Judge({"HTTP/1.1 100 C\r\n", "Content-Encoding: gzip\r\n"}));
  EXPECT_EQ(HeadFault::CONTENT_CODING, Judge({"HTTP/1.1 200 OK\r\n", "CONTENT-ENCODING :\t gzip \r\n"}));
  EXPECT_EQ(HeadFault::CONTENT_CODING,
            Judge({"HTTP/1.1 200 OK\r\n", "Content-Encoding: identity, gzip\r\n"}));
  EXPECT_EQ(HeadFault::NONE,
            Judge({"HTTP/1.1 200 OK\r\n", "Content-Encoding: Identity\r\n", "Content-Encoding:\r\n"}));
  EXPECT_EQ(HeadFault::NONE, Judge({"HTTP/1.1 200 OK\r\n", "Transfer-Encoding: CHUNKED\r\n"}));
  EXPECT_EQ(HeadFault::TRANSFER_CODING,
            Judge({"HTTP/1.1 200 OK\r\n", "Transfer-Encoding: gzip, chunked\r\n"}));
  EXPECT_EQ(HeadFault::TRANSFER_CODING,
            Judge({"HTTP/1.1 200 OK\r\n", "Transfer-Encoding:\r\n", " gzip\r\n"}));
}

TEST(ResponseHead, KeepsItsFirstFault) {
  EXPECT_EQ(HeadFault::CONTENT_CODING, Judge({"HTTP/1.1 200 OK\r\n", "Content-Encoding: gzip\r\n",
                                              "Transfer-Encoding: gzip\r\n", "\r\n"}));
}

TEST(ResponseHead, KnowsWhatEndsTheBody) {
  const struct {
    std::vector<std::string> lines;
    bool isEndedByConnection;
  } cases[] = {
      {{"HTTP/1.1 200 OK\r\n"}, false},
      {{"HTTP/1.1 200 OK\r\n", "\r\n"}, true},
      {{"HTTP/1.1 200 OK\r\n", "A: b\r\n", "\r\n"}, true},
      {{"HTTP/1.1 100 C\r\n", "Content-Length: 0\r\n", "\r\n", "HTTP/1.1 200 OK\r\n", "\r\n"}, true},
      {{"HTTP/1.1 200 OK\r\n", "content-length: 0\r\n", "\r\n"}, false},
      {{"HTTP/1.1 200 OK\r\n", "Transfer-Encoding: chunked\r\n", "\r\n"}, false},
      {{"HTTP/1.1 204 No Content\r\n", "\r\n"}, false},
      {{"HTTP/1.1 304 Not Modified\r\n", "\r\n"}, false},
  };
  for (const auto& c : cases) {
    ResponseHead head;
    TakeAll(head, c.lines);
    EXPECT_EQ(c.isEndedByConnection, head.IsEndedByConnection()) << testing::PrintToString(c.lines);
  }
}

TEST(ResponseHead, BoundsAllLinesTogether) {
  ResponseHead head;
  TakeAll(head, {"HTTP/1.1 100 C\r\n"});
  const std::string filler(kMaxResponseHeaderBytes - 16, 'x');
  EXPECT_EQ(HeadFault::NONE, head.TakeLine(filler.data(), filler.size()));
  EXPECT_EQ(HeadFault::TOO_LARGE, head.TakeLine("\n", 1));
}

}  // namespace
