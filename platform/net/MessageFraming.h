#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// Where the body of an HTTP answer ends, and in which form it comes, as its header says (RFC 9112,
/// section 6; RFC 9110, section 8.4).
///
/// A transfer library is lenient here: of two lengths it may believe the last, it may read "0x20"
/// as 0 and pass over a coding that it does not know, so that a body cut short, or in another form,
/// is taken for whole. To a transfer that must be whole or fail, each of these is a fault.
class MessageFraming {
 public:
  /// Takes a line of the header, with or without its line end. A status line forgets all before it.
  void takeLine(std::string_view line);

  /// Why nobody can tell where the body ends; empty when it can be told.
  std::string_view fault() const;

  /// The announced length; absent without one, and for a body in chunks, which end by themselves.
  std::optional<std::uint64_t> length() const { return isChunked_ ? std::nullopt : length_; }

  /// Whether nothing but the end of the connection ends the body.
  bool endsWithConnection() const { return !isChunked_ && !length_; }

  /// The content codings that were applied to the body, in lower case and in their order, of all
  /// lines that name some; "identity" is none.
  const std::vector<std::string>& contentCodings() const { return contentCodings_; }

 private:
  enum class Field { kLength, kTransferCoding, kContentCoding, kOther };

  void takeValue(std::string_view value);
  void takeLength(std::string_view digits);
  void takeTransferCoding(std::string_view name);

  Field field_ = Field::kOther;  // of the last line
  std::optional<std::uint64_t> length_;
  bool isChunked_ = false;
  bool hidesLength_ = false;  // a transfer coding that is none
  std::vector<std::string> contentCodings_;
  std::string_view fault_;
};

}  // namespace platform
