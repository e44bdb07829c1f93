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
#include "platform/xml/XMLEscaping.h"

namespace platform {

namespace {

constexpr std::size_t kBufferSize = std::size_t{1} << 20;

constexpr std::string_view kProlog =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<!DOCTYPE plist PUBLIC \"-//Apple//DTD PLIST 1.0//EN\" "
    "\"http://www.apple.com/DTDs/PropertyList-1.0.dtd\">\n"
    "<plist version=\"1.0\">\n";
constexpr std::string_view kEpilog = "</plist>\n";

/// Writes one document. The open containers stand on a stack of its own, so that no nesting can
/// exhaust the stack of the thread.
class Writer {
 public:
  explicit Writer(const ByteSink& sink) : sink_(sink) {}

  bool write(const Dictionary& root) {
    output_ += kProlog;
    writeValue(root);
    bool accepted = true;
    while (accepted && !levels_.empty()) {
      std::visit([this](auto& level) { writeNext(level); }, levels_.back());
      if (output_.size() >= kBufferSize) accepted = flush();
    }
    output_ += kEpilog;
    return accepted && flush();
  }

 private:
  /// A container whose parts are being written.
  template <typename Container>
  struct Level {
    typename Container::const_iterator next;
    typename Container::const_iterator end;
  };
  using ArrayLevel = Level<PropertyListValue::Array>;
  using DictionaryLevel = Level<Dictionary>;

  // A level may move while a value is written, since the value may open another level.

  void writeNext(ArrayLevel& level) {
    if (level.next == level.end) {
      closeContainer("array");
    } else {
      writeVariant(*level.next++);
    }
  }

  void writeNext(DictionaryLevel& level) {
    if (level.next == level.end) {
      closeContainer("dict");
      return;
    }
    const auto& [key, value] = *level.next++;
    indent();
    output_ += "<key>";
    appendEscapedText(output_, key);
    output_ += "</key>\n";
    writeVariant(value);
  }

  void writeVariant(const PropertyListValue& value) {
    std::visit([this](const auto& held) { writeValue(held); }, value.storage());
  }

  void writeValue(const Text& text) {
    startTag("string");
    appendEscapedText(output_, text);
    endTag("string");
  }

  void writeValue(std::int64_t number) { writeInteger(number); }
  void writeValue(std::uint64_t number) { writeInteger(number); }

  void writeValue(double number) {
    startTag("real");
    if (std::isnan(number)) {
      output_ += "nan";
    } else if (std::isinf(number)) {
      output_ += number < 0 ? "-infinity" : "+infinity";
    } else {
      appendNumber(number);
    }
    endTag("real");
  }

  void writeValue(bool flag) { emptyTag(flag ? "true" : "false"); }

  void writeValue(PointInTime date) {
    startTag("date");
    appendPropertyListDate(output_, date);
    endTag("date");
  }

  void writeValue(const PropertyListValue::Data& data) {
    startTag("data");
    appendBase64(output_, data.bytes);
    endTag("data");
  }

  void writeValue(const PropertyListValue::Array& array) { openContainer("array", array); }
  void writeValue(const Dictionary& dictionary) { openContainer("dict", dictionary); }

  template <typename Integer>
  void writeInteger(Integer number) {
    startTag("integer");
    appendNumber(number);
    endTag("integer");
  }

  template <typename Number>
  void appendNumber(Number number) {
    std::array<char, 32> digits{};
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), number);
    output_.append(digits.data(), result.ptr);
  }

  template <typename Container>
  void openContainer(std::string_view name, const Container& container) {
    if (container.empty()) {
      emptyTag(name);
      return;
    }
    startTag(name);
    output_ += '\n';
    levels_.push_back(Level<Container>{container.begin(), container.end()});
  }

  void closeContainer(std::string_view name) {
    levels_.pop_back();
    indent();
    endTag(name);
  }

  void emptyTag(std::string_view name) {
    indent();
    output_ += '<';
    output_ += name;
    output_ += "/>\n";
  }

  void startTag(std::string_view name) {
    indent();
    output_ += '<';
    output_ += name;
    output_ += '>';
  }

  void endTag(std::string_view name) {
    output_ += "</";
    output_ += name;
    output_ += ">\n";
  }

  void indent() { output_.append(levels_.size(), '\t'); }

  bool flush() {
    const bool accepted = sink_(output_);
    output_.clear();
    return accepted;
  }

  const ByteSink& sink_;
  std::string output_;
  std::vector<std::variant<ArrayLevel, DictionaryLevel>> levels_;
};

}  // namespace

bool writePropertyList(const Dictionary& dictionary, const ByteSink& sink) {
  return Writer(sink).write(dictionary);
}

}  // namespace platform
