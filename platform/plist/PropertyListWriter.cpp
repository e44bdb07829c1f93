#include "platform/plist/PropertyListWriter.h"

#include <array>
#include <charconv>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "platform/plist/PropertyListDate.h"
#include "platform/text/Base64.h"
#include "platform/xml/XMLWriter.h"

namespace platform {

namespace {

constexpr std::size_t kBufferSize = std::size_t{1} << 20;

constexpr std::string_view kHead =
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
    "<plist version=\"1.0\">\n";
constexpr std::string_view kTail = "</plist>\n";

/// Writes one list. The open containers stand on a stack of its own, so that no nesting can exhaust
/// the stack of the thread.
class Writer {
 public:
  explicit Writer(const ByteSink& sink) : sink_(sink) {}

  bool write(const Dictionary& root) {
    // The root's value stands no deeper than the root: it begins a document of its own.
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
    level.element.appendChild("key", key);
    writeVariant(level.element, value);
  }

  void writeVariant(XMLElement parent, const PropertyListValue& value) {
    std::visit([this, parent](const auto& held) { write(parent, held); }, value.storage());
  }

  void write(XMLElement parent, const Text& text) { parent.appendChild("string", text); }
  void write(XMLElement parent, std::int64_t number) {
    parent.appendChild("integer", std::to_string(number));
  }
  void write(XMLElement parent, std::uint64_t number) {
    parent.appendChild("integer", std::to_string(number));
  }
  void write(XMLElement parent, PointInTime date) {
    std::string text;
    appendPropertyListDate(text, date);
    parent.appendChild("date", text);
  }
  void write(XMLElement parent, bool flag) { parent.appendChild(flag ? "true" : "false"); }
  void write(XMLElement parent, double number) {
    std::array<char, 32> digits{};
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), number);
    std::string_view text(digits.data(), result.ptr);
    if (std::isnan(number)) text = "nan";
    if (std::isinf(number)) text = number < 0 ? "-infinity" : "+infinity";
    parent.appendChild("real", text);
  }
  void write(XMLElement parent, const PropertyListValue::Data& data) {
    std::string text;
    appendBase64(text, data.bytes);
    parent.appendChild("data", text);
  }
  void write(XMLElement parent, const PropertyListValue::Array& array) {
    open(parent.appendChild("array"), array);
  }
  void write(XMLElement parent, const Dictionary& dictionary) {
    open(parent.appendChild("dict"), dictionary);
  }

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
