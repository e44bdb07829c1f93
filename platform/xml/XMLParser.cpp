#include "platform/xml/XMLParser.h"

#include <expat.h>

#include <algorithm>
#include <memory>
#include <type_traits>

#include "platform/text/ASCII.h"
#include "platform/text/Memory.h"
#include "platform/text/TextEncoding.h"
#include "platform/xml/DocumentEncoding.h"
#include "platform/xml/ExpansionBudget.h"

namespace platform {
namespace {

constexpr std::string_view kUTF8Mark = "\xEF\xBB\xBF";

/// The library takes its input in ints and copies it into a buffer that it grows by doubling, to
/// 1 GiB at most. A document that fits is one piece, which spares the library's counting of lines,
/// too: that takes a third of the time. A tag that a piece of a larger one cuts is scanned anew
/// with the next piece, which is therefore as large as what waits, so that the scanning stays
/// linear.
constexpr std::size_t kPieceSize = std::size_t{64} << 20;
/// The library can double its buffer as long as what waits and the next piece stay below 1 GiB.
constexpr std::size_t kWaitingLimit = (std::size_t{1} << 30) - kPieceSize;

XMLName nameOf(const XML_Char* name) {
  const std::string_view qualified(name);
  return {qualified, qualified.substr(qualified.find(':') + 1)};
}

/// Makes the document UTF-8 and removes its byte order mark. False, with the fault, when its
/// encoding is not known.
bool makeUTF8(std::string& document, std::optional<XMLFault>& fault) {
  const DocumentEncoding encoding = DocumentEncoding::of(document);
  if (encoding.name == "UTF-8") {
    document.erase(0, encoding.markLength);
    return true;
  }
  std::optional<std::string> converted;
  if (encoding.name) {
    converted =
        convertedToUTF8(std::string_view(document).substr(encoding.markLength), *encoding.name);
  }
  if (converted) {
    document = std::move(*converted);
    return true;
  }
  constexpr std::size_t kShownLength = 64;  // the names of encodings are shorter
  const std::string_view label = encoding.label;
  fault =
      XMLFault{.code = XML_ERROR_UNKNOWN_ENCODING,
               .description = "unknown encoding \"" + std::string(label.substr(0, kShownLength)) +
                              (label.size() > kShownLength ? "...\"" : "\""),
               .position = positionBehind({document.data(), label.data()})};
  return false;
}

struct ParserFreer {
  void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
};

}  // namespace

ErrorRecord XMLFault::record() const {
  return {"XML", code, description + " at " + position.text()};
}

std::optional<std::string_view> XMLAttributes::value(std::string_view name) const {
  for (const char* const* pair = pairs_; *pair != nullptr; pair += 2) {
    if (name == pair[0]) return pair[1];
  }
  return std::nullopt;
}

/// One run of the library's parser over a document, which is UTF-8.
struct XMLParser::Run {
  Run(XMLParser& parser, std::string utf8)
      : owner(parser), document(std::move(utf8)), budget(document.size()) {
    const XML_Memory_Handling_Suite memory = {&Memory::allocate, &Memory::reallocate,
                                              &Memory::release};
    // The text is UTF-8 by now, whatever its declaration says.
    handle.reset(XML_ParserCreate_MM("UTF-8", &memory, nullptr));
    XML_SetUserData(handle.get(), this);
    XML_SetElementHandler(handle.get(), startElement, endElement);
    XML_SetCharacterDataHandler(handle.get(), characters);
    XML_SetEntityDeclHandler(handle.get(), declareEntity);
    XML_SetAttlistDeclHandler(handle.get(), declareAttribute);
    owner.run_ = this;

    next = std::min(document.find_first_not_of(kWhitespace), document.size());
    origin = positionBehind(std::string_view(document).substr(0, next));
    // Programs that put white space in front put it in front of a mark, too.
    if (std::string_view(document).substr(next).starts_with(kUTF8Mark)) next += kUTF8Mark.size();
  }
  ~Run() { owner.run_ = nullptr; }
  Run(const Run&) = delete;
  Run& operator=(const Run&) = delete;

  /// False when the library found a fault or an event ended the run.
  bool feed() {
    // A mark in front keeps the library from guessing at UTF-16.
    bool succeeded = XML_Parse(handle.get(), kUTF8Mark.data(), static_cast<int>(kUTF8Mark.size()),
                               XML_FALSE) == XML_STATUS_OK;
    const bool isWhole = document.size() - next <= owner.largestWholeSize_;
    bool isLast = false;
    while (succeeded && !isLast) {
      const std::size_t rest = document.size() - next;
      const std::size_t size = isWhole ? rest : std::min(rest, nextPieceSize());
      void* buffer = XML_GetBuffer(handle.get(), static_cast<int>(size));
      if (buffer == nullptr) return false;
      document.copy(static_cast<char*>(buffer), size, next);
      next += size;
      given += size;
      isLast = next == document.size();
      // The library has its own copy of the rest: what is read from it needs the room.
      if (isLast) std::string().swap(document);
      succeeded = XML_ParseBuffer(handle.get(), static_cast<int>(size), static_cast<int>(isLast)) ==
                  XML_STATUS_OK;
    }
    return succeeded;
  }

  std::size_t nextPieceSize() const {
    const XML_Index understood = XML_GetCurrentByteIndex(handle.get());
    if (understood < 0) return kPieceSize;
    const std::size_t waiting = given - std::min(given, static_cast<std::size_t>(understood));
    const std::size_t room = kWaitingLimit - std::min(kWaitingLimit, waiting);
    return std::max(kPieceSize, std::min(waiting, room));
  }

  /// The fault at the library's place, unless there is one already.
  void fail(XML_Error code, std::string description) {
    if (fault) return;
    const std::size_t line = XML_GetCurrentLineNumber(handle.get());
    const std::size_t column = XML_GetCurrentColumnNumber(handle.get());  // from 0
    // On its first line the library counts the mark, and nothing of what was skipped before it.
    const TextPosition position =
        line <= 1 ? TextPosition{origin.line, origin.column + std::max<std::size_t>(column, 1) - 1}
                  : TextPosition{origin.line + line - 1, column + 1};
    fault = XMLFault{code, std::move(description), position};
  }

  /// Ends the run with a fault that the library does not see.
  void refuse(XML_Error code, std::string description) {
    fail(code, std::move(description));
    XML_StopParser(handle.get(), XML_FALSE);
  }
  void refuseExpansion(std::string description) {
    refuse(XML_ERROR_AMPLIFICATION_LIMIT_BREACH, std::move(description));
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
      run.refuseExpansion(XML_ErrorString(XML_ERROR_AMPLIFICATION_LIMIT_BREACH));
    }
  }

  static void XMLCALL endElement(void* pointer, const XML_Char* name) {
    Run& run = *static_cast<Run*>(pointer);
    if (!run.fault) run.owner.events_.didEndElement(nameOf(name));
  }

  static void XMLCALL characters(void* pointer, const XML_Char* characters, int length) {
    Run& run = *static_cast<Run*>(pointer);
    if (run.fault) return;
    const std::string_view text(characters, static_cast<std::size_t>(length));
    if (run.budget.takeText(text.size())) {
      run.owner.events_.foundCharacters(text);
    } else {
      run.refuseExpansion(XML_ErrorString(XML_ERROR_AMPLIFICATION_LIMIT_BREACH));
    }
  }

  XMLParser& owner;
  std::string document;                  // emptied once the library has all of it
  std::size_t next = 0;                  // where in the document the next piece begins
  std::size_t given = kUTF8Mark.size();  // the bytes that the library has
  TextPosition origin;  // of the library's first character, behind white space that is skipped
  ExpansionBudget budget;
  std::optional<XMLFault> fault;
  std::unique_ptr<std::remove_pointer_t<XML_Parser>, ParserFreer> handle;
};

bool XMLParser::parse(std::optional<XMLFault>& fault) {
  std::string document = std::move(bytes_);
  if (!makeUTF8(document, fault)) return false;
  Run run(*this, std::move(document));
  if (run.feed()) return true;
  const XML_Error code = XML_GetErrorCode(run.handle.get());
  run.fail(code, code == XML_ERROR_NO_MEMORY ? "a tag or text too long for the parser"
                                             : XML_ErrorString(code));
  fault = std::move(run.fault);
  return false;
}

void XMLParser::abort(std::string description) {
  run_->refuse(XML_ERROR_ABORTED, std::move(description));
}

}  // namespace platform
