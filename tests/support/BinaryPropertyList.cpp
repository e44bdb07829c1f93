#include "tests/support/BinaryPropertyList.h"

#include <utility>

namespace {

constexpr std::size_t kOffsetWidth = 4;

}  // namespace

std::uint64_t BinaryPropertyList::addBytes(std::string bytes) {
  objects_.push_back(std::move(bytes));
  return objects_.size() - 1;
}

std::uint64_t BinaryPropertyList::addText(std::string_view ascii) {
  return addBytes(counted(0x5, ascii.size()) + std::string(ascii));
}

std::uint64_t BinaryPropertyList::addArray(const std::vector<std::uint64_t>& elements) {
  return addBytes(counted(0xA, elements.size()) + references(elements));
}

std::uint64_t BinaryPropertyList::addDictionary(const std::vector<std::uint64_t>& keys,
                                                const std::vector<std::uint64_t>& values) {
  return addBytes(counted(0xD, keys.size()) + references(keys) + references(values));
}

std::string BinaryPropertyList::bytes(std::uint64_t root) const {
  std::string result = "bplist00";
  std::string table;
  for (const std::string& object : objects_) {
    table += bigEndian(result.size(), kOffsetWidth);
    result += object;
  }
  const std::size_t tableOffset = result.size();
  return result + table + std::string(6, '\0') + bigEndian(kOffsetWidth, 1) +
         bigEndian(referenceWidth_, 1) + bigEndian(objects_.size(), 8) + bigEndian(root, 8) +
         bigEndian(tableOffset, 8);
}

std::string BinaryPropertyList::counted(unsigned kind, std::size_t count) {
  if (count < 0xF) return bigEndian(kind << 4 | count, 1);
  return bigEndian(kind << 4 | 0xF, 1) + "\x13" + bigEndian(count, 8);
}

std::string BinaryPropertyList::references(const std::vector<std::uint64_t>& numbers) const {
  std::string result;
  for (const std::uint64_t number : numbers) result += bigEndian(number, referenceWidth_);
  return result;
}

std::string bigEndian(std::uint64_t number, std::size_t width) {
  std::string bytes(width, '\0');
  for (std::size_t i = width; i > 0; --i, number >>= 8) {
    bytes[i - 1] = static_cast<char>(number & 0xFF);
  }
  return bytes;
}
