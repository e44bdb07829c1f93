#include "platform/net/MessageFraming.h"

#include <charconv>
#include <limits>
#include <system_error>
#include <utility>

#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/Splitting.h"

namespace platform {
namespace {

constexpr std::string_view kBrokenField = "The header does not tell where the body ends";

}  // namespace

void MessageFraming::takeLine(std::string_view line) {
  if (lowercased(line.substr(0, 5)) == "http/") {
    *this = MessageFraming();
    return;
  }
  if (trimmed(line).empty()) return;
  if (kWhitespace.find(line.front()) != std::string_view::npos) {
    // A field's second line, which servers must not send and few clients read alike.
    if (field_ == Field::kContentCoding) {
      takeValue(line);
    } else if (field_ != Field::kOther) {
      fault_ = kBrokenField;
    }
    return;
  }
  const std::size_t colon = line.find(':');
  const std::string_view name = line.substr(0, colon);
  const std::string plainName = lowercased(trimmed(name));
  field_ = plainName == "content-length"      ? Field::kLength
           : plainName == "transfer-encoding" ? Field::kTransferCoding
           : plainName == "content-encoding"  ? Field::kContentCoding
                                              : Field::kOther;
  if (field_ == Field::kOther) return;
  if (colon == std::string_view::npos || plainName.size() != name.size()) {
    // A library takes a name with a space behind it for another field.
    fault_ = kBrokenField;
    return;
  }
  takeValue(line.substr(colon + 1));
}

std::string_view MessageFraming::fault() const {
  // The library waits for the end of the connection then, whatever was announced.
  const bool isLengthHidden = hidesLength_ && !isChunked_ && length_;
  return fault_.empty() && isLengthHidden ? kBrokenField : fault_;
}

void MessageFraming::takeValue(std::string_view value) {
  for (const std::string_view piece : splitAt(value, ',')) {
    if (field_ == Field::kLength) {
      takeLength(trimmed(piece));
      continue;
    }
    std::string name = lowercased(trimmed(piece));
    const bool isNoCoding = name.empty() || name == "identity";
    if (isNoCoding && field_ == Field::kTransferCoding) hidesLength_ = true;
    if (isNoCoding) continue;
    if (field_ == Field::kTransferCoding) {
      takeTransferCoding(name);
    } else {
      contentCodings_.push_back(std::move(name));
    }
  }
}

void MessageFraming::takeLength(std::string_view digits) {
  constexpr std::uint64_t kLargest = std::numeric_limits<std::int64_t>::max();
  const char* const end = digits.data() + digits.size();
  std::uint64_t length = 0;
  const std::from_chars_result result = std::from_chars(digits.data(), end, length);
  if (result.ptr != end || result.ec == std::errc::invalid_argument) {
    fault_ = "The announced length is no number";
  } else if (result.ec == std::errc::result_out_of_range || length > kLargest) {
    fault_ = "The announced length cannot be true";
  } else if (length_ && *length_ != length) {
    fault_ = "The announced lengths contradict each other";
  }
  length_ = length;
}

void MessageFraming::takeTransferCoding(std::string_view name) {
  if (name == "chunked") {
    isChunked_ = true;
  } else {
    fault_ = "The body comes in a transfer coding that was not asked for";
  }
}

}  // namespace platform
