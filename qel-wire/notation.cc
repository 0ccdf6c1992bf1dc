#include "notation.h"

#include <nettle/base16.h>
#include <nettle/base64.h>

#include <algorithm>
#include <iterator>

#include "hex.h"
#include "misread.h"

namespace qel_wire {
namespace {

std::string from_base64(std::string_view text) {
  std::string digits;
  std::copy_if(text.begin(), text.end(), std::back_inserter(digits), [](char c) {
    return std::string_view(" \t\r\n\f\v").find(c) == std::string_view::npos;
  });
  std::replace(digits.begin(), digits.end(), '-', '+');
  std::replace(digits.begin(), digits.end(), '_', '/');
  const bool is_byte_missing = digits.size() % 4 == 1;  // six bits are no byte
  digits.append((4 - digits.size() % 4) % 4, '=');
  std::string bytes(BASE64_DECODE_LENGTH(digits.size()), '\0');
  size_t size = bytes.size();
  base64_decode_ctx context;
  base64_decode_init(&context);
  if (is_byte_missing ||
      base64_decode_update(&context, &size, reinterpret_cast<uint8_t*>(bytes.data()), digits.size(),
                           digits.data()) != 1 ||
      base64_decode_final(&context) != 1) {
    const size_t stray = text.find_first_not_of(
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/-_= \t\r\n\f\v");
    throw stray != std::string_view::npos
        ? misread_at(text, stray, "a character that base64 does not have")
        : misread_at(text, text.size(),
                     "the base64 ends too early, has '=' within it, or bits that are no byte");
  }
  bytes.resize(size);
  return bytes;
}

}  // namespace

std::string from_notation(std::string_view text, Notation notation) {
  return notation == Notation::kHex ? from_hex(text) : from_base64(text);
}

std::string to_notation(std::string_view bytes, Notation notation) {
  const auto* data = reinterpret_cast<const uint8_t*>(bytes.data());
  std::string text;
  if (notation == Notation::kHex) {
    text.resize(BASE16_ENCODE_LENGTH(bytes.size()));
    base16_encode_update(text.data(), bytes.size(), data);
  } else {
    text.resize(BASE64_ENCODE_RAW_LENGTH(bytes.size()));
    base64_encode_raw(text.data(), bytes.size(), data);
  }
  return text;
}

}  // namespace qel_wire
