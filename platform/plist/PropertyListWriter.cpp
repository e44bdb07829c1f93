#include "platform/plist/PropertyListWriter.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "platform/plist/PropertyListDate.h"
#include "platform/xml/XMLWriter.h"

namespace platform {
namespace {

constexpr std::size_t kBufferSize = std::size_t{1} << 20;

constexpr std::string_view kHead =
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
    "<plist version=\"1.0\">\n";
constexpr std::string_view kTail = "</plist>\n";

/// Whether a podcast has values of this kind.
bool isWritten(const PropertyListValue& value) {
  const PropertyListValue::Storage& held = value.storage();
  return !std::holds_alternative<double>(held) && !std::holds_alternative<bool>(held) &&
         !std::holds_alternative<PropertyListValue::Data>(held);
}

/// Writes one list. The open containers stand on a stack of its own, so that no nesting can exhaust
/// the stack of the thread.
class Writer {
 public:
  explicit Writer(const ByteSink& sink) : sink_(sink) {}

  bool write(const Dictionary& root) {
    // The "plist" around it is written by hand: its content is not indented.
    output_ += kHead;
    open(xml_.appendRoot("dict"), root);
    bool accepted = true;
    while (accepted && !levels_.empty()) {
      std::visit([this](auto& level) { writeNext(level); }, levels_.back());
      if (output_.size() >= kBufferSize) accepted = flush();
    }
    xml_.finish();
    output_ += kTail;
    return accepted && flush();
  }

 private:
  /// A container whose parts are being written.
  template <typename Container>
  struct Level {
    XMLElement element;
    typename Container::const_iterator next;
    typename Container::const_iterator end;
  };
  using ArrayLevel = Level<PropertyListValue::Array>;
  using DictionaryLevel = Level<Dictionary>;

  // A level may move while a value is written, since the value may open another level.

  void writeNext(ArrayLevel& level) {
    if (level.next == level.end) {
      levels_.pop_back();
    } else {
      writeVariant(level.element, *level.next++);
    }
  }

  void writeNext(DictionaryLevel& level) {
    if (level.next == level.end) {
      levels_.pop_back();
      return;
    }
    const auto& [key, value] = *level.next++;
    if (!isWritten(value)) return;
    level.element.appendChild("key", key);
    writeVariant(level.element, value);
  }

  void writeVariant(XMLElement parent, const PropertyListValue& value) {
    std::visit([this, parent](const auto& held) { this->write(parent, held); }, value.storage());
  }

  static void write(XMLElement parent, const Text& text) { parent.appendChild("string", text); }
  static void write(XMLElement parent, std::int64_t number) {
    parent.appendChild("integer", std::to_string(number));
  }
  static void write(XMLElement parent, std::uint64_t number) {
    parent.appendChild("integer", std::to_string(number));
  }
  static void write(XMLElement parent, PointInTime date) {
    parent.appendChild("date", propertyListDate(date));
  }
  void write(XMLElement parent, const PropertyListValue::Array& array) {
    open(parent.appendChild("array"), array);
  }
  void write(XMLElement parent, const Dictionary& dictionary) {
    open(parent.appendChild("dict"), dictionary);
  }
  static void write(XMLElement /*parent*/, const auto& /*other*/) {}

  template <typename Container>
  void open(XMLElement element, const Container& container) {
    levels_.push_back(Level<Container>{element, container.begin(), container.end()});
  }

  bool flush() {
    const bool accepted = sink_(output_);
    output_.clear();
    return accepted;
  }

  const ByteSink& sink_;
  std::string output_;
  XMLWriter xml_{output_, {.indentation = '\t', .indentationWidth = 1, .emptyTagEnd = "/>"}};
  std::vector<std::variant<ArrayLevel, DictionaryLevel>> levels_;
};

}  // namespace

bool writePropertyList(const Dictionary& dictionary, const ByteSink& sink) {
  return Writer(sink).write(dictionary);
}

}  // namespace platform
