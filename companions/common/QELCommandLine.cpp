#include "companions/common/QELCommandLine.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <system_error>
#include <utility>

#include "platform/files/StandardStreams.h"
#include "platform/net/URL.h"
#include "platform/process/CommandOptions.h"
#include "platform/text/ASCII.h"
#include "platform/text/Case.h"
#include "platform/text/FormattedText.h"

namespace {

/// Names of ASCII alone, of those that XML allows, are told from mistakes.
bool isPrefix(std::string_view name) {
  const auto isOfName = [](char c) {
    return platform::isASCIILetter(c) || platform::isASCIIDigit(c) || c == '_' || c == '-' ||
           c == '.';
  };
  if (name.empty() || !(platform::isASCIILetter(name.front()) || name.front() == '_')) return false;
  if (!std::all_of(name.begin(), name.end(), isOfName)) return false;
  // XML keeps what begins with "xml" to itself.
  if (platform::lowercased(name).starts_with("xml")) return false;
  return name != "dc" && name != "qel" && name != "atom";
}

}  // namespace

QELCommandLine::QELCommandLine(std::string name, std::string usage, std::string summary,
                               std::vector<QELOption> options)
    : name_(std::move(name)),
      usage_(std::move(usage)),
      summary_(std::move(summary)),
      options_(std::move(options)) {
  options_.push_back({"help", 'h', "", "print this help and exit", {}});
  options_.push_back({"version", 'V', "", "print the version and exit", {}});
}

std::optional<int> QELCommandLine::parse(std::span<const char* const> arguments) {
  std::vector<platform::CommandOption> known;
  for (const QELOption& option : options_) {
    known.push_back({option.name, option.letter, !option.valueName.empty()});
  }
  platform::CommandWords words = platform::parseCommandWords(arguments, known);
  if (words.fault) return wrongUse(*words.fault);
  for (const auto& [index, value] : words.options) {
    const QELOption& option = options_[index];
    if (option.name == "help" || option.name == "version") {
      platform::writeToStandardOutput(option.name == "help" ? help()
                                                            : name_ + " " QEL_VERSION "\n");
      return finish(kAllWell);
    }
    if (!option.take(value)) {
      return wrongUse("'" + value + "' is no value of option '--" + option.name + "'");
    }
  }
  operands_ = std::move(words.operands);
  return std::nullopt;
}

void QELCommandLine::report(std::string_view message) const {
  platform::flushStandardOutput();
  platform::writeToStandardError(
      platform::formattedText("%@: %@\n", {name_, message}, platform::controlsOfStandardError()));
}

int QELCommandLine::wrongUse(std::string_view message) const {
  report(std::string(message).append("; see '").append(name_).append(" --help'"));
  return kNothingDone;
}

int QELCommandLine::finish(int status) const {
  platform::ErrorSlot error;
  if (platform::flushStandardOutput(error)) return status;
  report("cannot write to standard output: " + error->description);
  return std::max(status, kSomethingToLookAt);
}

std::string QELCommandLine::help() const {
  const auto synopsis = [](const QELOption& option) {
    const std::string letter =
        option.letter == '\0' ? "    " : std::string("-") + option.letter + ", ";
    const std::string value = option.valueName.empty() ? "" : " " + option.valueName;
    return "  " + letter + "--" + option.name + value;
  };
  std::size_t width = 0;
  for (const QELOption& option : options_) width = std::max(width, synopsis(option).size());

  std::string text = "Usage: " + name_ + " " + usage_ + "\n" + summary_ + "\n\n";
  for (const QELOption& option : options_) {
    std::string line = synopsis(option);
    line.resize(width + 2, ' ');
    text += line + option.help + "\n";
  }
  return text + "\nThe manual: man " + name_ + "\n";
}

std::function<bool(const std::string&)> QELTakeFlag(bool& flag) {
  return [&flag](const std::string&) { return flag = true; };
}

std::function<bool(const std::string&)> QELTakeNumber(std::int64_t& number, std::int64_t least) {
  return [&number, least](const std::string& value) {
    std::int64_t parsed = 0;
    const char* const end = value.data() + value.size();
    const std::from_chars_result result = std::from_chars(value.data(), end, parsed);
    if (result.ec != std::errc() || result.ptr != end || parsed < least) return false;
    number = parsed;
    return true;
  };
}

std::function<bool(const std::string&)> QELTakeDirectory(QELDirectory& directory) {
  return [&directory](const std::string& value) {
    const std::size_t equals = value.find('=');
    if (equals == std::string::npos) return false;
    directory = {value.substr(0, equals), value.substr(equals + 1)};
    return isPrefix(directory.prefix) && platform::URL::parse(directory.uri).has_value();
  };
}

std::function<bool(const std::string&)> QELTakeURL(std::optional<std::string>& text) {
  return [&text](const std::string& value) {
    const auto url = platform::URL::parse(value);
    if (!url || (url->scheme() != "http" && url->scheme() != "https")) return false;
    text = url->encodedText();
    return true;
  };
}

std::function<bool(const std::string&)> QELTakeLanguage(std::optional<std::string>& tag) {
  return [&tag](const std::string& value) {
    const auto isOfTag = [](char c) {
      return platform::isASCIILetter(c) || platform::isASCIIDigit(c) || c == '-';
    };
    tag = value;
    return !value.empty() && platform::isASCIILetter(value.front()) && value.back() != '-' &&
           value.find("--") == std::string::npos &&
           std::all_of(value.begin(), value.end(), isOfTag);
  };
}
