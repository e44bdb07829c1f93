#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/plist/PropertyListBuilder.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/text/Text.h"

namespace platform {

/// Reads the binary form of a property list, for readPropertyList.
///
/// The form is a header, objects, a table of the objects' offsets, and a trailer that tells where
/// the table lies. An array or a dictionary names its parts by their numbers in the table, so any
/// number of containers can share an object. Nothing of this is believed: every offset, count and
/// size is checked before it is used.
class BinaryPropertyListReader {
 public:
  /// The bytes are not copied: they must outlive the reader.
  explicit BinaryPropertyListReader(std::string_view bytes);

  /// Called once at most. Absent, with the fault, for bytes that are no such list.
  std::optional<PropertyListValue> read(std::optional<PropertyListFault>& fault);

 private:
  enum class Kind : unsigned;

  struct Object {
    Kind kind;
    std::uint64_t size;   // the low half of the marker, or the count that stands behind it
    std::size_t content;  // the offset of the first byte behind marker and count
  };

  /// An array or dictionary whose parts are being read.
  struct Level {
    std::uint64_t number;
    bool isDictionary;
    std::size_t references;  // the offset of the first reference
    std::size_t count;       // of elements or entries
    std::size_t next = 0;
  };

  bool readTrailer();
  bool readObject(std::uint64_t number);
  bool readNextPart();
  bool readKey(std::uint64_t number);
  bool openContainer(std::uint64_t number, const Object& object);
  std::optional<Object> objectAt(std::uint64_t number);

  // Absent for an object that is cut or not of a kind that a property list has.
  std::optional<PropertyListValue> scalar(std::uint64_t number, const Object& object);
  std::optional<PropertyListValue> integer(const Object& object) const;
  std::optional<PropertyListValue> real(const Object& object) const;
  std::optional<PropertyListValue> date(const Object& object) const;
  std::optional<PropertyListValue> data(const Object& object);
  std::optional<Text> text(std::uint64_t number, const Object& object);

  /// Whether that many items of that width lie between the object's content and the objects' end.
  bool holds(const Object& object, std::uint64_t count, std::size_t width) const;
  std::uint64_t unsignedAt(std::size_t offset, std::size_t width) const;
  bool spend(std::uint64_t memory);
  /// Keeps the first fault that is told, of the object if one is named; returns false.
  bool fail(std::string description, std::optional<std::uint64_t> object = std::nullopt);

  std::string_view bytes_;
  std::size_t tableOffset_ = 0;  // where the objects end
  std::size_t offsetWidth_ = 0;
  std::size_t referenceWidth_ = 0;
  std::uint64_t objectCount_ = 0;

  PropertyListBuilder builder_;
  std::vector<Level> levels_;
  std::vector<bool> isOpen_;  // by object number: whether it is one of the levels
  std::vector<Text> texts_;   // by object number: read once, then shared
  std::uint64_t memoryLeft_;
  std::optional<PropertyListFault> fault_;
};

}  // namespace platform
