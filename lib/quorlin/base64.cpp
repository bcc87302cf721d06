// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/Base64.h>

#include <array>
#include <cctype>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>

namespace {

// RFC 4648, table 1, in value order.
constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr char kPad = '=';

constexpr std::size_t kMaxLength = std::numeric_limits<std::size_t>::max();
constexpr std::size_t kBytesPerGroup = 3;
constexpr std::size_t kCharactersPerGroup = 4;

// What the decoder makes of a character that has no value.
enum Marker : signed char { MARKER_SKIP = -1, MARKER_END = -2, MARKER_INVALID = -3 };

using DecodingTable = std::array<signed char, 256>;

constexpr DecodingTable MakeDecodingTable() {
  DecodingTable table = {};
  for (signed char& entry : table) {
    entry = MARKER_INVALID;
  }
  for (signed char value = 0; value < 64; ++value) {
    table[static_cast<unsigned char>(kAlphabet[value])] = value;
  }
  for (const char space : {'\t', '\n', '\v', '\f', '\r', ' '}) {
    table[static_cast<unsigned char>(space)] = MARKER_SKIP;
  }
  table[0] = MARKER_END;
  table[static_cast<unsigned char>(kPad)] = MARKER_END;
  return table;
}

constexpr DecodingTable kDecodingTable = MakeDecodingTable();

// The number of characters without the NUL. False when there is no room for them and the NUL in any buffer.
bool CountCharacters(std::size_t sourceLength, std::size_t& count) {
  const std::size_t groups = sourceLength / kBytesPerGroup + (sourceLength % kBytesPerGroup != 0 ? 1 : 0);
  if (groups > (kMaxLength - 1) / kCharactersPerGroup) {
    return false;
  }
  count = groups * kCharactersPerGroup;
  return true;
}

char* EncodeGroup(const unsigned char* bytes, char* out) {
  *out++ = kAlphabet[bytes[0] >> 2];
  *out++ = kAlphabet[(bytes[0] & 3) << 4 | bytes[1] >> 4];
  *out++ = kAlphabet[(bytes[1] & 15) << 2 | bytes[2] >> 6];
  *out++ = kAlphabet[bytes[2] & 63];
  return out;
}

// The last one or two bytes, which fill a group of four characters up with padding.
char* EncodeRest(const unsigned char* bytes, std::size_t count, char* out) {
  *out++ = kAlphabet[bytes[0] >> 2];
  if (count == 1) {
    *out++ = kAlphabet[(bytes[0] & 3) << 4];
    *out++ = kPad;
  } else {
    *out++ = kAlphabet[(bytes[0] & 3) << 4 | bytes[1] >> 4];
    *out++ = kAlphabet[(bytes[1] & 15) << 2];
  }
  *out++ = kPad;
  return out;
}

// Puts values of six bits together to bytes. Bits that complete no byte stay behind.
class ByteAssembler {
 public:
  ByteAssembler(unsigned char* destination, std::size_t size) : _destination(destination), _size(size) {}

  std::size_t GetCount() const { return _count; }

  /// False when the buffer is full, whether or not the value would complete a byte.
  bool Add(unsigned value) {
    if (_count == _size) {
      return false;
    }
    _bits = _bits << 6 | value;
    _pending += 6;
    if (_pending >= 8) {
      _pending -= 8;
      _destination[_count++] = static_cast<unsigned char>(_bits >> _pending);
      _bits &= (1U << _pending) - 1;
    }
    return true;
  }

 private:
  unsigned char* _destination;
  std::size_t _size;
  std::size_t _count = 0;
  unsigned _bits = 0;
  unsigned _pending = 0;
};

}  // namespace

bool Base64_Encode(const void* source, std::size_t sourceLength, char* destination,
                   std::size_t destinationSize, std::size_t* written) {
  std::size_t needed = 0;
  if (!CountCharacters(sourceLength, needed) || needed >= destinationSize) {
    if (written != nullptr) {
      *written = 0;
    }
    return false;
  }
  const unsigned char* bytes = static_cast<const unsigned char*>(source);
  char* out = destination;
  std::size_t left = sourceLength;
  for (; left >= kBytesPerGroup; left -= kBytesPerGroup, bytes += kBytesPerGroup) {
    out = EncodeGroup(bytes, out);
  }
  if (left != 0) {
    out = EncodeRest(bytes, left, out);
  }
  *out = '\0';
  if (written != nullptr) {
    *written = needed;
  }
  return true;
}

bool Base64_Decode(const char* source, void* destination, std::size_t destinationSize, std::size_t* written) {
  // As long as can be: the NUL ends the text.
  return Base64_ChunkDecode(source, kMaxLength, destination, destinationSize, written);
}

bool Base64_ChunkDecode(const char* source, std::size_t sourceLength, void* destination,
                        std::size_t destinationSize, std::size_t* written) {
  *written = 0;
  ByteAssembler bytes(static_cast<unsigned char*>(destination), destinationSize);
  for (std::size_t i = 0; i < sourceLength; ++i) {
    const signed char value = kDecodingTable[static_cast<unsigned char>(source[i])];
    if (value == MARKER_END) {
      break;
    }
    if (value == MARKER_SKIP) {
      continue;
    }
    if (value == MARKER_INVALID || !bytes.Add(static_cast<unsigned>(value))) {
      return false;
    }
  }
  *written = bytes.GetCount();
  return true;
}

bool Base64_ValidEncoding(const char* source, std::size_t sourceLength) {
  for (std::size_t i = 0; i < sourceLength; ++i) {
    const unsigned char character = static_cast<unsigned char>(source[i]);
    if (std::isalnum(character) == 0 && character != '+' && character != '/' && character != kPad) {
      return false;
    }
  }
  return true;
}

std::size_t Base64_EncodedLength(const void* /*source*/, std::size_t sourceLength) {
  std::size_t count = 0;
  // A length that no buffer can have, where the text would be longer than any.
  return CountCharacters(sourceLength, count) ? count + 1 : kMaxLength;
}

std::size_t Base64_DecodedLength(const char* source, std::size_t sourceLength) {
  const std::size_t length = sourceLength / kCharactersPerGroup * kBytesPerGroup;
  if (length == 0 || source[sourceLength - 1] != kPad) {
    return length;
  }
  return source[sourceLength - 2] == kPad ? length - 2 : length - 1;
}

bool Base64_EasyEncode(const void* source, std::size_t sourceLength, char** result) {
  *result = nullptr;
  std::size_t count = 0;
  if (!CountCharacters(sourceLength, count)) {
    return false;
  }
  char* text = static_cast<char*>(std::malloc(count + 1));
  if (text == nullptr || !Base64_Encode(source, sourceLength, text, count + 1, nullptr)) {
    std::free(text);
    return false;
  }
  *result = text;
  return true;
}

bool Base64_EasyDecode(const char* source, void** result, std::size_t* resultLength) {
  const std::size_t size = Base64_DecodedLength(source, std::strlen(source));
  void* bytes = std::malloc(size);
  if (bytes == nullptr || !Base64_Decode(source, bytes, size, resultLength)) {
    std::free(bytes);
    *result = nullptr;
    *resultLength = 0;
    return false;
  }
  *result = bytes;
  return true;
}
