#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

/// Builds binary property lists ("bplist00") object by object, malformed ones too: nothing that is
/// given is checked.
class BinaryPropertyList {
 public:
  /// The width of an object number inside arrays and dictionaries, in bytes.
  explicit BinaryPropertyList(std::size_t referenceWidth = 1) : referenceWidth_(referenceWidth) {}

  /// Adds an object and returns its number: 0, 1, 2, ...
  std::uint64_t addBytes(std::string bytes);
  std::uint64_t addText(std::string_view ascii);
  std::uint64_t addArray(const std::vector<std::uint64_t>& elements);
  std::uint64_t addDictionary(const std::vector<std::uint64_t>& keys,
                              const std::vector<std::uint64_t>& values);

  /// The whole list with that object as its root, and offsets of 4 bytes.
  std::string bytes(std::uint64_t root) const;

 private:
  static std::string counted(unsigned kind, std::size_t count);
  std::string references(const std::vector<std::uint64_t>& numbers) const;

  std::size_t referenceWidth_;
  std::vector<std::string> objects_;
};

/// The number in big-endian bytes.
std::string bigEndian(std::uint64_t number, std::size_t width);
