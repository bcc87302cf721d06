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
  EXPECT_EQ(HeadFault::NONE, TakeAll(head, {"HTTP/1.1 200 OK\r\n", "\r\n", "HTTP/1.1 404 No\r\n", "\r\n",
                                            "Content-Encoding: gzip\r\n"}));
  EXPECT_EQ(200, head.GetStatusCode());
  EXPECT_EQ("OK", head.GetReason());
}

TEST(ResponseHead, RefusesOtherVersionsAndBadCodes) {
  for (const char* const line :
       {"HTTP/2 200 OK\r\n", "HTTP/2.0 200 OK\r\n", "HTTP/0.9 200 OK\r\n", "HTTP/1.1\r\n", "HTTP/1.1 20\r\n",
        "HTTP/1.1 2x0 OK\r\n", "HTTP/1.1  200 OK\r\n", "HTTP/\r\n", "HTTP/1.x 200 OK\r\n",
        "HTTP/1.1x200 OK\r\n", "HTTP/1.1 2000 OK\r\n", "HTTP/1.1 200OK\r\n", "HTTP/1.1 099 OK\r\n",
        "http/1.1 200 OK\r\n", "X: a\r\n", "\r\n", "HTTP/1.1 101 Switching Protocols\r\n"}) {
    EXPECT_EQ(HeadFault::NOT_HTTP_1, Judge({line})) << line;
  }
}

TEST(ResponseHead, RefusesAnythingButAStatusLineAfterAnInterimResponse) {
  EXPECT_EQ(HeadFault::NOT_HTTP_1, Judge({"HTTP/1.1 100 C\r\n", "\r\n", "X: a\r\n"}));
  EXPECT_EQ(HeadFault::NOT_HTTP_1, Judge({"HTTP/1.1 100 C\r\n", "\r\n", "\r\n"}));
}

TEST(ResponseHead, RefusesCodingsOfTheFinalResponseOnly) {
  EXPECT_EQ(HeadFault::NONE, Judge({"HTTP/1.1 100 C\r\n", "Content-Encoding: gzip\r\n"}));
  EXPECT_EQ(HeadFault::CONTENT_CODING, Judge({"HTTP/1.1 200 OK\r\n", "CONTENT-ENCODING:\t gzip \r\n"}));
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

TEST(ResponseHead, RefusesLinesThatAreNoFields) {
  for (const std::string& line : {
           std::string("HTTP/1.1 500 No\r\n"),
           std::string("no colon\r\n"),
           std::string(": no name\r\n"),
           std::string("Content-Length : 5\r\n"),
           std::string("Content-Length\t: 5\r\n"),
           std::string(" folded: yes\r\n"),
           std::string("\tfolded\r\n"),
           std::string("X: a\0b\r\n", 8),
           std::string("X: a\rb\r\n"),
           std::string("X: a\x1b[31m\r\n"),
           std::string("N\xC3\xA9: a\r\n"),
           std::string("(X): a\r\n"),
       }) {
    EXPECT_EQ(HeadFault::BAD_FIELD, Judge({"HTTP/1.1 200 OK\r\n", line})) << line;
    EXPECT_EQ(HeadFault::BAD_FIELD, Judge({"HTTP/1.1 103 Early Hints\r\n", line})) << line;
  }
  for (const char* const line :
       {"X:\r\n", "X: \t a\tb \r\n", "!#$%&'*+-.^_`|~09azAZ:a\n", "X: \xC3\xA9 \xFF\r\n"}) {
    EXPECT_EQ(HeadFault::NONE, Judge({"HTTP/1.1 200 OK\r\n", line})) << line;
  }
}

TEST(ResponseHead, TakesOneClearOpinionAboutTheBodysLength) {
  const std::string kOk = "HTTP/1.1 200 OK\r\n";
  const std::string kFive = "Content-Length: 5\r\n";
  const std::string kChunked = "Transfer-Encoding: chunked\r\n";
  EXPECT_EQ(HeadFault::NONE, Judge({kOk, kFive, "\r\n"}));
  EXPECT_EQ(HeadFault::NONE, Judge({kOk, kChunked, "\r\n"}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kOk, kFive, "content-length: 6\r\n"}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kOk, kFive, kFive}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kOk, kFive, kChunked}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kOk, kChunked, kFive}));
  for (const char* const value : {"", "+5", "-5", "5, 5", "5,6", "0x5", "5 6", "5;", "five"}) {
    EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kOk, std::string("Content-Length: ") + value + "\r\n"}))
        << value;
  }
  EXPECT_EQ(HeadFault::TRANSFER_CODING, Judge({kOk, kChunked, kChunked}));
  for (const char* const value :
       {"", "identity", "chunked, chunked", "chunked, identity", "xchunked", "\"chunked\""}) {
    EXPECT_EQ(HeadFault::TRANSFER_CODING, Judge({kOk, std::string("Transfer-Encoding: ") + value + "\r\n"}))
        << value;
  }
  EXPECT_EQ(HeadFault::TRANSFER_CODING, Judge({"HTTP/1.0 200 OK\r\n", kChunked}));
}

TEST(ResponseHead, RefusesABodyWhereNoneMayBe) {
  const std::string kNoContent = "HTTP/1.1 204 No Content\r\n";
  EXPECT_EQ(HeadFault::NONE, Judge({kNoContent, "\r\n"}));
  EXPECT_EQ(HeadFault::NONE, Judge({kNoContent, "Content-Length: 0\r\n", "\r\n"}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kNoContent, "Content-Length: 1\r\n", "\r\n"}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kNoContent, "Content-Length: 00100\r\n", "\r\n"}));
  EXPECT_EQ(HeadFault::BODY_LENGTH, Judge({kNoContent, "Transfer-Encoding: chunked\r\n", "\r\n"}));
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
  const std::string filler = "X:" + std::string(kMaxResponseHeaderBytes - 18, 'x');
  EXPECT_EQ(HeadFault::NONE, head.TakeLine(filler.data(), filler.size()));
  EXPECT_EQ(HeadFault::TOO_LARGE, head.TakeLine("\n", 1));
}

}  // namespace
