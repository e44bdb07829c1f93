#include "platform/plist/BinaryPropertyListReader.h"

#include <algorithm>
#include <bit>
#include <chrono>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "platform/plist/PropertyListBuilder.h"
#include "platform/text/ASCII.h"
#include "platform/text/TextEncoding.h"
#include "platform/xml/MemoryBudget.h"

namespace platform {
namespace {

constexpr std::string_view kHeader = "bplist00";
constexpr std::size_t kTrailerSize = 32;
constexpr std::size_t kWidestInteger = 8;

/// Containers that share their parts can make a list of any size out of a few bytes, and so can
/// long texts and data that stand in many places. So what is made of a list is counted, and may
/// take a fixed multiple of its bytes in memory, which is several times of what one without shared
/// containers takes. The allowance on top is for lists that are small whatever they do.
constexpr std::uint64_t kMemoryAllowance = std::uint64_t{6} << 20;
constexpr std::uint64_t kMemoryPerByte = 40;

/// 2001-01-01 00:00:00 UTC, from where dates count, in seconds since 1970.
constexpr double kDateOrigin = 978307200.0;

/// The high half of an object's marker.
enum class Kind : unsigned {
  kSimple = 0x0,
  kInteger = 0x1,
  kReal = 0x2,
  kDate = 0x3,
  kData = 0x4,
  kTextASCII = 0x5,
  kTextUTF16 = 0x6,
  kTextUTF8 = 0x7,
  kArray = 0xA,
  kOrderedSet = 0xB,
  kSet = 0xC,
  kDictionary = 0xD,
};

struct Object {
  std::size_t number;
  Kind kind;
  std::size_t size;     // the low half of the marker, or the count that stands behind it
  std::size_t content;  // the offset of the first byte behind marker and count
};

/// An array or dictionary whose parts are being read.
struct Level {
  std::size_t number;
  bool isDictionary;
  std::size_t references;  // the offset of the first reference
  std::size_t count;       // of elements or entries
  std::size_t next = 0;
};

/// Reads one list, whose bytes outlive it.
class Reader {
 public:
  explicit Reader(std::string_view bytes)
      : bytes_(bytes), memory_(kMemoryAllowance + kMemoryPerByte * bytes.size()) {}

  std::optional<PropertyListValue> read(std::optional<PropertyListFault>& fault) {
    bool succeeded = readTrailer();
    while (succeeded && !levels_.empty()) succeeded = readNextPart();
    if (succeeded) return builder_.takeRoot();
    fault = std::move(fault_);
    return std::nullopt;
  }

 private:
  bool readTrailer() {
    if (!bytes_.starts_with(kHeader)) return fail("a binary property list of an unknown version");
    if (bytes_.size() < kHeader.size() + kTrailerSize) return fail("a cut binary property list");

    const std::size_t tableEnd = bytes_.size() - kTrailerSize;
    offsetWidth_ = sizeAt(tableEnd + 6, 1);
    referenceWidth_ = sizeAt(tableEnd + 7, 1);
    objectCount_ = sizeAt(tableEnd + 8, 8);
    const std::uint64_t root = unsignedAt(tableEnd + 16, 8);
    const std::size_t tableOffset = sizeAt(tableEnd + 24, 8);

    const auto isWidth = [](std::size_t width) { return width >= 1 && width <= kWidestInteger; };
    if (!isWidth(offsetWidth_) || !isWidth(referenceWidth_) || tableOffset < kHeader.size() ||
        tableOffset > tableEnd || objectCount_ > (tableEnd - tableOffset) / offsetWidth_) {
      return fail("a binary property list with a malformed trailer");
    }
    tableOffset_ = tableOffset;

    // There are no more objects than bytes, so this is always there.
    static_assert(sizeof(Text) <= kMemoryPerByte);
    memory_.take(objectCount_ * sizeof(Text));
    texts_.resize(objectCount_);
    isOpen_.resize(objectCount_);
    return readObject(root);
  }

  bool readNextPart() {
    Level& level = levels_.back();
    if (level.next == level.count) {
      isOpen_[level.number] = false;
      levels_.pop_back();
      builder_.end();
      return true;
    }
    std::size_t reference = level.references + level.next * referenceWidth_;
    if (level.isDictionary) {
      if (!readKey(unsignedAt(reference, referenceWidth_))) return false;
      reference += level.count * referenceWidth_;  // the values stand behind all the keys
    }
    ++level.next;
    return readObject(unsignedAt(reference, referenceWidth_));
  }

  bool readKey(std::uint64_t reference) {
    const auto object = objectAt(reference);
    if (!object) return false;
    const auto key = text(*object);
    if (!key) return fail("a key that is no text", reference);
    // Keys are not written, but compared wherever they stand.
    if (!allow(memory_.take(key->size()))) return false;
    builder_.setKey(*key);
    return true;
  }

  bool readObject(std::uint64_t reference) {
    const auto object = objectAt(reference);
    if (!object) return false;
    switch (object->kind) {
      case Kind::kArray:
      case Kind::kOrderedSet:
      case Kind::kSet:
      case Kind::kDictionary:
        return openContainer(*object);
      default:
        break;
    }
    auto value = scalar(*object);
    if (!value) return fail("an object that is cut or of an unknown kind", reference);
    builder_.add(std::move(*value));
    return true;
  }

  bool openContainer(const Object& object) {
    const bool isDictionary = object.kind == Kind::kDictionary;
    if (isOpen_[object.number]) {
      return fail("an array or dictionary that contains itself", object.number);
    }
    if (levels_.size() >= kPropertyListDepthLimit) return fail(kPropertyListTooDeep, object.number);
    if (!holds(object, object.size, isDictionary ? 2 * referenceWidth_ : referenceWidth_)) {
      return fail("an array or dictionary that is cut", object.number);
    }
    if (!allow(isDictionary ? memory_.takeFields(object.size) : memory_.takeRecords(object.size))) {
      return false;
    }

    if (isDictionary) {
      builder_.beginDictionary(object.size);
    } else {
      builder_.beginArray(object.size);
    }
    isOpen_[object.number] = true;
    levels_.push_back({.number = object.number,
                       .isDictionary = isDictionary,
                       .references = object.content,
                       .count = object.size});
    return true;
  }

  std::optional<Object> objectAt(std::uint64_t reference) {
    if (reference >= objectCount_) {
      fail("an object that does not exist", reference);
      return std::nullopt;
    }
    const auto number = static_cast<std::size_t>(reference);
    const std::size_t offset = sizeAt(tableOffset_ + number * offsetWidth_, offsetWidth_);
    if (offset < kHeader.size() || offset >= tableOffset_) {
      fail("an object that lies outside of the objects", number);
      return std::nullopt;
    }
    const std::size_t marker = sizeAt(offset, 1);
    Object object{.number = number,
                  .kind = static_cast<Kind>(marker >> 4),
                  .size = marker & 0xF,
                  .content = offset + 1};

    const bool isCounted = object.kind >= Kind::kData;
    if (isCounted && object.size == 0xF) {
      const Object count{
          .number = number, .kind = Kind::kInteger, .size = 0, .content = object.content + 1};
      const std::size_t countMarker = holds(object, 1, 1) ? sizeAt(object.content, 1) : 0;
      const std::size_t width = std::size_t{1} << (countMarker & 0x3);
      // Counts of 1, 2, 4 and 8 bytes: markers 0x10 to 0x13.
      if (countMarker >> 2 != 0x10 >> 2 || !holds(count, 1, width)) {
        fail("an object with a malformed count", number);
        return std::nullopt;
      }
      object.size = sizeAt(count.content, width);
      object.content = count.content + width;
    }
    return object;
  }

  /// Absent for an object that is cut or not of a kind that a property list has.
  std::optional<PropertyListValue> scalar(const Object& object) {
    switch (object.kind) {
      case Kind::kSimple:
        if (object.size == 0x8) return PropertyListValue(false);
        if (object.size == 0x9) return PropertyListValue(true);
        return std::nullopt;
      case Kind::kInteger:
        return integer(object);
      case Kind::kReal:
        return real(object);
      case Kind::kDate:
        return date(object);
      case Kind::kData:
        return data(object);
      default:
        break;
    }
    auto shared = text(object);
    // It is held once, and written wherever it stands.
    if (!shared || !allow(memory_.takeWritten(*shared))) return std::nullopt;
    return PropertyListValue(std::move(*shared));
  }

  std::optional<PropertyListValue> integer(const Object& object) const {
    if (object.size > 4 || !holds(object, 1, std::size_t{1} << object.size)) return std::nullopt;
    if (object.size < 3) {
      return PropertyListValue(unsignedAt(object.content, std::size_t{1} << object.size));
    }
    // Shorter integers have no sign; those of 8 bytes have one, and those of 16 bytes hold both
    // what is negative and what exceeds the 8.
    const std::uint64_t first = unsignedAt(object.content, 8);
    if (object.size == 3) return PropertyListValue(static_cast<std::int64_t>(first));
    const std::uint64_t second = unsignedAt(object.content + 8, 8);
    if (first == 0) return PropertyListValue(second);
    const auto negative = static_cast<std::int64_t>(second);
    if (first == ~std::uint64_t{0} && negative < 0) return PropertyListValue(negative);
    return std::nullopt;
  }

  std::optional<PropertyListValue> real(const Object& object) const {
    if (object.size == 2 && holds(object, 1, 4)) {
      const auto bits = static_cast<std::uint32_t>(unsignedAt(object.content, 4));
      return PropertyListValue(static_cast<double>(std::bit_cast<float>(bits)));
    }
    if (object.size == 3 && holds(object, 1, 8)) {
      return PropertyListValue(std::bit_cast<double>(unsignedAt(object.content, 8)));
    }
    return std::nullopt;
  }

  std::optional<PropertyListValue> date(const Object& object) const {
    if (object.size != 3 || !holds(object, 1, 8)) return std::nullopt;
    const auto seconds = std::bit_cast<double>(unsignedAt(object.content, 8));
    const double milliseconds = std::round((seconds + kDateOrigin) * 1000.0);
    // Written so that what is no number is refused too.
    if (!(milliseconds >= -0x1p63 && milliseconds < 0x1p63)) return std::nullopt;
    return PropertyListValue(
        PointInTime(std::chrono::milliseconds(static_cast<std::int64_t>(milliseconds))));
  }

  std::optional<PropertyListValue> data(const Object& object) {
    if (!holds(object, object.size, 1) || !allow(memory_.take(object.size))) return std::nullopt;
    return PropertyListValue(
        PropertyListValue::Data{std::string(bytes_.substr(object.content, object.size))});
  }

  std::optional<Text> text(const Object& object) {
    const bool isUTF16 = object.kind == Kind::kTextUTF16;
    if (!isUTF16 && object.kind != Kind::kTextASCII && object.kind != Kind::kTextUTF8) {
      return std::nullopt;
    }
    Text& text = texts_[object.number];
    if (!text.empty()) return text;

    if (!holds(object, object.size, isUTF16 ? 2 : 1)) return std::nullopt;
    const std::string_view encoded =
        bytes_.substr(object.content, isUTF16 ? 2 * object.size : object.size);
    // Objects may overlap, so that even unshared texts can exceed the bytes by any factor.
    if (!allow(memory_.take(encoded.size()))) return std::nullopt;
    if (!isUTF16 && isASCII(encoded)) {
      text = Text(encoded);
    } else {
      const std::string_view encoding = isUTF16                           ? "UTF-16BE"
                                        : object.kind == Kind::kTextASCII ? "US-ASCII"
                                                                          : "UTF-8";
      auto converted = convertedToUTF8(encoded, encoding);
      if (!converted) return std::nullopt;
      if (converted->size() > encoded.size() &&
          !allow(memory_.take(converted->size() - encoded.size()))) {
        return std::nullopt;
      }
      text = Text(*converted);
    }
    return text;
  }

  /// Whether that many items of that width lie between the object's content and the objects' end.
  bool holds(const Object& object, std::size_t count, std::size_t width) const {
    // The content never begins beyond the end of the objects, so the difference cannot wrap.
    return count <= (tableOffset_ - object.content) / width;
  }

  /// A count or an offset. One that no memory could hold is the largest there is, which lies beyond
  /// every bound.
  std::size_t sizeAt(std::size_t offset, std::size_t width) const {
    return static_cast<std::size_t>(std::min<std::uint64_t>(
        unsignedAt(offset, width), std::numeric_limits<std::size_t>::max()));
  }

  std::uint64_t unsignedAt(std::size_t offset, std::size_t width) const {
    std::uint64_t number = 0;
    for (const char byte : bytes_.substr(offset, width)) {
      number = number << 8 | static_cast<unsigned char>(byte);
    }
    return number;
  }

  bool allow(bool isWithinBudget) {
    return isWithinBudget || fail("a binary property list whose shared objects make it too large");
  }

  /// Keeps the first fault that is told, of the object if one is named; returns false.
  bool fail(std::string description, std::optional<std::uint64_t> object = std::nullopt) {
    if (!fault_) {
      fault_ = PropertyListFault{.description = std::move(description), .object = object};
    }
    return false;
  }

  std::string_view bytes_;
  std::size_t tableOffset_ = 0;  // where the objects end
  std::size_t offsetWidth_ = 0;
  std::size_t referenceWidth_ = 0;
  std::size_t objectCount_ = 0;

  PropertyListBuilder builder_;
  std::vector<Level> levels_;
  std::vector<bool> isOpen_;  // by object number: whether it is one of the levels
  std::vector<Text> texts_;   // by object number: read once, then shared
  MemoryBudget memory_;
  std::optional<PropertyListFault> fault_;
};

}  // namespace

std::optional<PropertyListValue> readBinaryPropertyList(std::string_view bytes,
                                                        std::optional<PropertyListFault>& fault) {
  return Reader(bytes).read(fault);
}

}  // namespace platform
