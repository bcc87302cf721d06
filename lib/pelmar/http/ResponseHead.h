// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The part of a response before its body, line by line as it arrives (RFC 9112, sections 4 and 5).

#ifndef PELMAR_HTTP_RESPONSEHEAD_H
#define PELMAR_HTTP_RESPONSEHEAD_H

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Http {

enum class HeadFault {
  NONE,
  TOO_LARGE,        ///< More than kMaxResponseHeaderBytes, interim responses and trailers included.
  NOT_HTTP_1,       ///< A status line of another protocol or version, or a switch to one (101).
  CONTENT_CODING,   ///< A Content-Encoding, though the request asked for none.
  TRANSFER_CODING,  ///< A Transfer-Encoding other than chunked, once, in HTTP/1.1.
  BAD_FIELD,        ///< A header line that is no name, colon and value, or that continues the one before.
  BODY_LENGTH,  ///< More than one opinion about where the body ends, a Content-Length that is no number, or a
                ///< body with 204.
};

/// Follows the lines of interim responses, the final one and trailers. Splitting the stream into lines, body
/// lengths and the connection's fate are the HTTP engine's; this decides what we do not want to see at all:
/// above all what two readers could read differently (RFC 9112, sections 5.1, 5.2, 6.1 and 6.3), because such
/// a reader may stand between the server and us.
class ResponseHead final {
 public:
  /// Takes one line with its line end. What it finds stays found: later lines change nothing.
  HeadFault TakeLine(const char* line, std::size_t size);

  HeadFault GetFault() const { return _fault; }
  /// Whether any byte has come.
  bool HasStarted() const { return _bytes > 0; }
  /// Whether the final response's head has come to its end.
  bool IsComplete() const { return _isComplete; }
  /// Whether nothing but the end of the connection ends the body (RFC 9112, section 6.3, rule 8).
  bool IsEndedByConnection() const;
  /// 0 before there is one.
  int GetStatusCode() const { return _statusCode; }
  /// Control characters are replaced by "?": the phrase ends up in messages.
  const std::string& GetReason() const { return _reason; }

 private:
  HeadFault Judge(const std::string& line);
  HeadFault TakeStatusLine(const std::string& line);
  HeadFault TakeEnd();
  HeadFault TakeField(const std::string& line);
  HeadFault TakeContentLength(const std::string& value);
  HeadFault TakeTransferCoding(const std::string& value);

  std::size_t _bytes = 0;
  int _statusCode = 0;
  std::string _reason;
  bool _isComplete = false;
  bool _awaitsStatusLine = true;
  bool _isHttp10 = false;
  bool _hasContentLength = false;
  bool _hasTransferCoding = false;
  bool _announcesBody = false;
  HeadFault _fault = HeadFault::NONE;
};

/// `text` with "?" for each control character.
std::string MaskControlCharacters(std::string text);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_RESPONSEHEAD_H
