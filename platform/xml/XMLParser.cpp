#include "platform/xml/XMLParser.h"

// The header declares the limits of entities only to those who say that the library has them.
#define XML_DTD 1  // NOLINT(cppcoreguidelines-macro-usage)
#include <expat.h>

#include <algorithm>
#include <cstring>
#include <memory>
#include <type_traits>

#include "platform/text/ASCII.h"
#include "platform/text/Memory.h"
#include "platform/text/TextEncoding.h"
#include "platform/xml/DocumentEncoding.h"
#include "platform/xml/ExpansionBudget.h"

namespace platform {
namespace {

constexpr XML_Memory_Handling_Suite kMemory = {&Memory::allocate, &Memory::reallocate,
                                               &Memory::release};

constexpr std::string_view kUTF8Mark = "\xEF\xBB\xBF";

/// The library parses what lies in its own buffer, which it grows by doubling, as far as an int
/// counts. A document that fits is read whole, which spares the library's counting of lines, too:
/// that takes a tenth of the time. A tag that a piece of a larger one cuts waits in the buffer, and
/// is scanned anew with each further piece.
constexpr std::size_t kPieceSize = std::size_t{64} << 20;

/// The longest that may wait, so that a document which is all one tag is told from a lack of
/// memory.
constexpr std::uint64_t kLongestTag = 2 * kPieceSize;
constexpr const char* kTooLong = "a tag or text too long for the parser";

/// At least so many bytes are read first, so that marks and white space to skip lie in the first
/// piece also where a document is larger than expected.
constexpr std::size_t kSmallestSize = std::size_t{64} << 10;

/// The library's own limit, for one attribute made of many references: it is counted only when it
/// is there, and stands in memory four times by then.
constexpr float kLargestAmplification = 12;
constexpr unsigned long long kAnyAmplificationSize = 4ULL << 20U;

XMLName nameOf(const XML_Char* name) {
  const std::string_view qualified(name);
  return {qualified, qualified.substr(qualified.find(':') + 1)};
}

XMLFault faultOfReading(const ErrorSlot& error) {
  return {.description = error->description, .reading = error};
}

/// Makes the document UTF-8. False, with the fault, when its encoding is not known.
bool makeUTF8(ByteSource& document, std::optional<XMLFault>& fault) {
  ErrorSlot error;
  std::string_view head = document.head(error);
  DocumentEncoding encoding = DocumentEncoding::of(head);
  // The declaration may end behind the head.
  const bool isTold = encoding.name == "UTF-8" && head.find('>') != std::string_view::npos &&
                      document.encodingHint().empty();
  if (isTold) return true;

  std::optional<std::string> bytes;
  if (!error) bytes = document.readAll(error);
  if (!bytes) {
    fault = faultOfReading(error);
    return false;
  }
  encoding = DocumentEncoding::of(*bytes, document.encodingHint());
  if (encoding.name && encoding.name != "UTF-8") {
    bytes = convertedToUTF8(std::string_view(*bytes).substr(encoding.markLength), *encoding.name);
  }
  if (encoding.name && bytes) {
    document = ByteSource(std::move(*bytes), document.compressedSize());
    return true;
  }
  constexpr std::size_t kShownLength = 64;  // the names of encodings are shorter
  fault = XMLFault{.code = XML_ERROR_UNKNOWN_ENCODING,
                   .description = "unknown encoding \"" + encoding.label.substr(0, kShownLength) +
                                  (encoding.label.size() > kShownLength ? "...\"" : "\""),
                   .position = encoding.position};
  return false;
}

}  // namespace

ErrorRecord XMLFault::record() const {
  return reading.value_or(ErrorRecord{"XML", code, description + " at " + position.text()});
}

std::optional<std::string_view> XMLAttributes::value(std::string_view name) const {
  for (const char* const* pair = pairs_; *pair != nullptr; pair += 2) {
    if (name == pair[0]) return pair[1];
  }
  return std::nullopt;
}

/// One run of the library's parser over a document, which is UTF-8.
struct XMLParser::Run {
  explicit Run(XMLParser& parser) : owner(parser), budget(parser.document_.compressedSize()) {
    XML_SetUserData(handle.get(), this);
    XML_SetElementHandler(handle.get(), startElement, endElement);
    XML_SetCharacterDataHandler(handle.get(), characters);
    XML_SetEntityDeclHandler(handle.get(), declareEntity);
    XML_SetAttlistDeclHandler(handle.get(), declareAttribute);
    XML_SetBillionLaughsAttackProtectionMaximumAmplification(handle.get(), kLargestAmplification);
    XML_SetBillionLaughsAttackProtectionActivationThreshold(handle.get(), kAnyAmplificationSize);
    owner.run_ = this;
  }
  ~Run() { owner.run_ = nullptr; }
  Run(const Run&) = delete;
  Run& operator=(const Run&) = delete;

  /// False when the library found a fault, an event ended the run, or reading failed.
  bool feed() {
    // A mark in front keeps the library from guessing at UTF-16.
    XML_Parse(handle.get(), kUTF8Mark.data(), static_cast<int>(kUTF8Mark.size()), XML_FALSE);
    std::uint64_t fed = kUTF8Mark.size();
    const std::size_t expected = std::max(owner.document_.expectedSize(), kSmallestSize);
    // The byte beyond what is expected lets the end be seen.
    std::size_t size = expected < owner.largestWholeSize_ ? expected + 1 : kPieceSize;
    for (bool isFirst = true;; isFirst = false) {
      auto* const buffer = static_cast<char*>(XML_GetBuffer(handle.get(), static_cast<int>(size)));
      if (buffer == nullptr) return false;
      ErrorSlot error;
      const std::optional<std::size_t> count = owner.document_.read({buffer, size}, error);
      if (!count) {
        fault = faultOfReading(error);
        return false;
      }
      budget.grow(*count);
      const bool isLast = *count < size;
      const std::size_t skipped = isFirst ? skip({buffer, *count}) : 0;
      if (skipped > 0) std::memmove(buffer, buffer + skipped, *count - skipped);
      const XML_Status status = XML_ParseBuffer(handle.get(), static_cast<int>(*count - skipped),
                                                static_cast<int>(isLast));
      if (status != XML_STATUS_OK || isLast) return status == XML_STATUS_OK;
      fed += *count - skipped;
      const auto parsed = static_cast<std::uint64_t>(XML_GetCurrentByteIndex(handle.get()));
      if (fed > parsed && fed - parsed > kLongestTag) {
        fail(XML_ERROR_NO_MEMORY, kTooLong);
        return false;
      }
      size = kPieceSize;
    }
  }

  /// The length of the marks and of the white space before a document's first character.
  std::size_t skip(std::string_view document) {
    std::size_t size = document.starts_with(kUTF8Mark) ? kUTF8Mark.size() : 0;
    const std::size_t start =
        std::min(document.find_first_not_of(kWhitespace, size), document.size());
    origin = positionBehind(document.substr(size, start - size));
    // Programs that put white space in front put it in front of a mark, too.
    return start + (document.substr(start).starts_with(kUTF8Mark) ? kUTF8Mark.size() : 0);
  }

  /// The fault at the library's place, unless there is one already.
  void fail(XML_Error code, std::string description) {
    if (fault) return;
    const TextPosition where = position();
    fault = XMLFault{code, std::move(description), where};
  }

  TextPosition position() const {
    const std::size_t line = XML_GetCurrentLineNumber(handle.get());
    const std::size_t column = XML_GetCurrentColumnNumber(handle.get());  // from 0
    // On its first line the library counts the mark, and nothing of what was skipped before it.
    if (line > 1) return {origin.line + line - 1, column + 1};
    return {origin.line, origin.column + std::max<std::size_t>(column, 1) - 1};
  }

  /// Ends the run with a fault that the library does not see.
  void refuse(XML_Error code, std::string description) {
    fail(code, std::move(description));
    XML_StopParser(handle.get(), XML_FALSE);
  }
  void refuseExpansion(std::string description) {
    refuse(XML_ERROR_AMPLIFICATION_LIMIT_BREACH, std::move(description));
  }
  void refuseExpansion() {
    refuseExpansion(budget.isCompressed()
                        ? "a document out of all proportion to its compressed form"
                        : XML_ErrorString(XML_ERROR_AMPLIFICATION_LIMIT_BREACH));
  }

  // The library may have events left when the run has been ended: the end of an empty element.

  static void XMLCALL declareEntity(void* pointer, const XML_Char* /*name*/, int isParameter,
                                    const XML_Char* value, int length, const XML_Char* /*base*/,
                                    const XML_Char* /*systemID*/, const XML_Char* /*publicID*/,
                                    const XML_Char* /*notation*/) {
    Run& run = *static_cast<Run*>(pointer);
    // One that is external has no value, and the length 0.
    const std::string_view text(value, static_cast<std::size_t>(length));
    if (!run.budget.takeEntity(isParameter == 0, text)) {
      run.refuseExpansion("too many entities made of entities");
    }
  }

  static void XMLCALL declareAttribute(void* pointer, const XML_Char* /*element*/,
                                       const XML_Char* /*name*/, const XML_Char* /*type*/,
                                       const XML_Char* /*value*/, int /*isRequired*/) {
    Run& run = *static_cast<Run*>(pointer);
    if (!run.budget.takeAttribute()) run.refuseExpansion("too many declared attributes");
  }

  static void XMLCALL startElement(void* pointer, const XML_Char* name,
                                   const XML_Char** attributes) {
    Run& run = *static_cast<Run*>(pointer);
    if (run.fault) return;
    if (run.budget.takeElement(name, attributes)) {
      run.owner.events_.didStartElement(nameOf(name), XMLAttributes(attributes));
    } else {
      run.refuseExpansion();
    }
  }

  static void XMLCALL endElement(void* pointer, const XML_Char* name) {
    Run& run = *static_cast<Run*>(pointer);
    if (run.fault) return;
    run.budget.endElement(name);
    run.owner.events_.didEndElement(nameOf(name));
  }

  static void XMLCALL characters(void* pointer, const XML_Char* characters, int length) {
    Run& run = *static_cast<Run*>(pointer);
    if (run.fault) return;
    const std::string_view text(characters, static_cast<std::size_t>(length));
    if (run.budget.takeText(text.size())) {
      run.owner.events_.foundCharacters(text);
    } else {
      run.refuseExpansion();
    }
  }

  XMLParser& owner;
  TextPosition origin;  // of the library's first character, behind white space that is skipped
  ExpansionBudget budget;
  std::optional<XMLFault> fault;
  // The text is UTF-8 by now, whatever its declaration says.
  std::unique_ptr<std::remove_pointer_t<XML_Parser>, decltype(&XML_ParserFree)> handle{
      XML_ParserCreate_MM("UTF-8", &kMemory, nullptr), &XML_ParserFree};
};

bool XMLParser::parse(std::optional<XMLFault>& fault) {
  const std::size_t receivedSize = document_.expectedSize();
  if (!makeUTF8(document_, fault)) return false;
  Run run(*this);
  const std::size_t size = document_.expectedSize();
  if (!run.budget.takeConversion(size - std::min(size, receivedSize))) {
    run.refuseExpansion();
  } else if (run.feed()) {
    return true;
  }
  if (const XML_Error code = XML_GetErrorCode(run.handle.get()); !run.fault) {
    run.fail(code, code == XML_ERROR_NO_MEMORY ? kTooLong : XML_ErrorString(code));
  }
  fault = std::move(run.fault);
  return false;
}

MemoryBudget* XMLParser::budgetToCount() {
  return run_->budget.isCounting() ? &run_->budget.memory() : nullptr;
}

void XMLParser::refuseExpansion() {
  run_->refuseExpansion();
}

void XMLParser::abort(std::string description) {
  run_->refuse(XML_ERROR_ABORTED, std::move(description));
}

TextPosition XMLParser::position() const {
  return run_->position();
}

}  // namespace platform
