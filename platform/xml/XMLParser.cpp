#include "platform/xml/XMLParser.h"

#include <expat.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <iterator>
#include <memory>
#include <new>
#include <type_traits>

#include "platform/text/Memory.h"
#include "platform/text/TextEncoding.h"

namespace platform {

using namespace std::string_view_literals;

namespace {

constexpr std::string_view kUTF8Mark = "\xEF\xBB\xBF";
constexpr std::string_view kWhitespace = " \t\r\n";
constexpr std::string_view kDeclarationStart = "<?xml";

// The library takes its input in ints and copies it into a buffer that it grows by doubling, to
// 1 GiB at most. A document that fits is one piece, which spares the library's counting of lines,
// too: that takes a third of the time. A tag that a piece of a larger one cuts is scanned anew with
// the next piece, which is therefore as large as what waits, so that the scanning stays linear.
constexpr std::size_t kPieceSize = std::size_t{64} << 20;
// The library can double its buffer as long as what waits and the next piece stay below 1 GiB.
constexpr std::size_t kWaitingLimit = (std::size_t{1} << 30) - kPieceSize;

// What declarations can add to a document. The library recurses once for each entity inside an
// entity, compares each attribute that is declared with all of its element's, and goes through
// these at each such element. It bounds what entities deliver only at a hundred times the document,
// and attributes by default not at all.
constexpr std::size_t kNestingEntitiesLimit = 1000;
constexpr std::size_t kDeclaredAttributesLimit = 256;
// Bytes of elements: their names and attributes. Without entities no document exceeds its share:
// the shortest element, "<a/>", counts for just three times its bytes.
constexpr std::size_t kElementsAllowance = std::size_t{1} << 20;
constexpr std::size_t kElementsPerByte = 3;
constexpr std::size_t kSizeOfElement = 11;
// Bytes of text, which costs far less to keep. A feed may have its notice on every item from an
// entity.
constexpr std::size_t kTextAllowance = std::size_t{4} << 20;
constexpr std::size_t kTextPerByte = 8;

// An encoding's name is shorter; a longer one is not repeated in a message.
constexpr std::size_t kShownLabelLength = 64;

struct ByteOrderMark {
  std::string_view bytes;
  std::string_view encoding;
};
// The marks of UTF-32 stand before those of UTF-16 that they begin with.
constexpr std::array<ByteOrderMark, 5> kByteOrderMarks = {{{kUTF8Mark, "UTF-8"},
                                                           {"\xFF\xFE\0\0"sv, "UTF-32LE"},
                                                           {"\0\0\xFE\xFF"sv, "UTF-32BE"},
                                                           {"\xFF\xFE"sv, "UTF-16LE"},
                                                           {"\xFE\xFF"sv, "UTF-16BE"}}};

struct ShownEncoding {
  std::string_view encoding;
  std::size_t markLength = 0;
};

// A place in a text, counted from 1.
struct Position {
  std::size_t line = 1;
  std::size_t column = 1;

  std::string text() const {
    return "line " + std::to_string(line) + ", column " + std::to_string(column);
  }
};

// The place behind these characters.
Position positionBehind(std::string_view text) {
  Position position;
  char previous = '\0';
  for (const char character : text) {
    const bool endsLine = character == '\n' || character == '\r';
    if (endsLine && !(character == '\n' && previous == '\r')) {
      ++position.line;
      position.column = 1;
    } else if (!endsLine && (static_cast<unsigned char>(character) & 0xC0U) != 0x80U) {
      ++position.column;
    }
    previous = character;
  }
  return position;
}

ErrorRecord recordOf(XML_Error code, std::string description) {
  return {"XML", static_cast<std::int64_t>(code), std::move(description)};
}

bool isEncodingName(std::string_view name) {
  constexpr std::string_view kLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  constexpr std::string_view kCharacters =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789._-";
  return !name.empty() && kLetters.find(name.front()) != std::string_view::npos &&
         name.find_first_not_of(kCharacters) == std::string_view::npos;
}

// The encoding that the XML declaration names; empty when there is none, and when the declaration
// is malformed, which is then the parser's to report.
std::string_view declaredEncoding(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(kWhitespace), text.size()));
  if (!text.starts_with(kDeclarationStart)) return {};
  text = text.substr(kDeclarationStart.size(), text.find('>') - kDeclarationStart.size());
  const auto skipWhitespace = [&text] {
    text.remove_prefix(std::min(text.find_first_not_of(kWhitespace), text.size()));
  };
  while (true) {
    skipWhitespace();
    const std::string_view name = text.substr(0, text.find_first_of("= \t\r\n"));
    text.remove_prefix(name.size());
    skipWhitespace();
    if (!text.starts_with('=')) return {};
    text.remove_prefix(1);
    skipWhitespace();
    if (!text.starts_with('"') && !text.starts_with('\'')) return {};
    const std::size_t end = text.find(text.front(), 1);
    if (end == std::string_view::npos) return {};
    const std::string_view value = text.substr(1, end - 1);
    text.remove_prefix(end + 1);
    if (name == "encoding") return isEncodingName(value) ? value : std::string_view();
  }
}

// The encoding that the first bytes of a document show, and the length of their byte order mark. No
// encoding when they show none: then the declaration can be read byte by byte.
ShownEncoding encodingShownBy(std::string_view bytes) {
  for (const ByteOrderMark& mark : kByteOrderMarks) {
    if (bytes.starts_with(mark.bytes)) return {mark.encoding, mark.bytes.size()};
  }
  // Without a mark, UTF-16 and UTF-32 show in the zeros around the first character, which is "<" or
  // white space.
  if (bytes.size() < 4) return {};
  const auto isZero = [bytes](std::size_t index) { return bytes[index] == '\0'; };
  if (isZero(0) && isZero(1) && isZero(2)) return {"UTF-32BE"};
  if (isZero(1) && isZero(2) && isZero(3)) return {"UTF-32LE"};
  if (isZero(0)) return {"UTF-16BE"};
  if (isZero(1)) return {"UTF-16LE"};
  return {};
}

// The encoding to read a document as whose declaration, readable byte by byte, names this one.
// Absent when it is not known.
std::optional<std::string> encodingMeantBy(std::string_view declared) {
  std::optional<std::string> name = canonicalEncodingName(declared);
  // Such a declaration is wrong when it claims wide characters.
  if (name && (name->starts_with("UTF-16") || name->starts_with("UTF-32"))) return "UTF-8";
  if (name == "ISO-8859-1" || name == "US-ASCII") return "windows-1252";
  return name;
}

// Makes the document UTF-8; where its text then begins, behind a byte order mark. Absent, with the
// error, when the encoding is not known.
std::optional<std::size_t> makeUTF8(std::string& document, ErrorSlot& error) {
  const ShownEncoding shown = encodingShownBy(document);
  const std::string_view text = std::string_view(document).substr(shown.markLength);
  std::string_view label = shown.encoding;
  std::optional<std::string> encoding(label);
  std::size_t labelPosition = 0;
  if (label.empty()) {
    label = declaredEncoding(text);
    if (label.empty()) return shown.markLength;
    labelPosition = static_cast<std::size_t>(label.data() - text.data());
    encoding = encodingMeantBy(label);
  }
  if (encoding == "UTF-8") return shown.markLength;

  std::optional<std::string> converted;
  if (encoding) converted = convertedToUTF8(text, *encoding);
  if (!converted) {
    const std::string shownLabel = std::string(label.substr(0, kShownLabelLength)) +
                                   (label.size() > kShownLabelLength ? "..." : "");
    error = recordOf(XML_ERROR_UNKNOWN_ENCODING,
                     "unknown encoding \"" + shownLabel + "\" at " +
                         positionBehind(text.substr(0, labelPosition)).text());
    return std::nullopt;
  }
  document = std::move(*converted);
  return 0;
}

XMLName nameOf(const XML_Char* name) {
  const std::string_view qualified(name);
  return {qualified, qualified.substr(qualified.find(':') + 1)};
}

struct ParserFreer {
  void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
};

}  // namespace

std::optional<std::string_view> XMLAttributes::value(std::string_view name) const {
  for (const char* const* pair = pairs_; *pair != nullptr; pair += 2) {
    if (name == pair[0]) return pair[1];
  }
  return std::nullopt;
}

// One run of the library's parser over a document, which begins at `start` and is UTF-8.
struct XMLParser::Run {
  Run(XMLParser& parser, std::string utf8, std::size_t start)
      : owner(parser),
        document(std::move(utf8)),
        elementsLeft(kElementsAllowance + kElementsPerByte * document.size()),
        textLeft(kTextAllowance + kTextPerByte * document.size()) {
    // The text is UTF-8 by now, whatever its declaration says.
    const XML_Memory_Handling_Suite memory = {&Memory::allocate, &Memory::reallocate,
                                              &Memory::release};
    handle.reset(XML_ParserCreate_MM("UTF-8", &memory, nullptr));
    XML_SetUserData(handle.get(), this);
    XML_SetElementHandler(handle.get(), startElement, endElement);
    XML_SetCharacterDataHandler(handle.get(), characters);
    XML_SetEntityDeclHandler(handle.get(), declareEntity);
    XML_SetAttlistDeclHandler(handle.get(), declareAttribute);
    owner.run_ = this;

    next = std::min(document.find_first_not_of(kWhitespace, start), document.size());
    origin = positionBehind(std::string_view(document).substr(start, next - start));
    // Programs that put white space in front put it in front of a mark, too.
    if (std::string_view(document).substr(next).starts_with(kUTF8Mark)) next += kUTF8Mark.size();
  }
  ~Run() { owner.run_ = nullptr; }
  Run(const Run&) = delete;
  Run& operator=(const Run&) = delete;

  // False when the library found a fault or an event ended the run.
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

  std::string position() const {
    const std::size_t line = XML_GetCurrentLineNumber(handle.get());
    const std::size_t column = XML_GetCurrentColumnNumber(handle.get());  // from 0
    // On its first line the library counts the mark, and nothing of what was skipped before it.
    return (line <= 1 ? Position{origin.line, origin.column + std::max<std::size_t>(column, 1) - 1}
                      : Position{origin.line + line - 1, column + 1})
        .text();
  }

  ErrorRecord fault() const {
    const XML_Error code = XML_GetErrorCode(handle.get());
    return recordOf(code, std::string(XML_ErrorString(code)) + " at " + position());
  }

  bool isEnded() const { return thrown || owner.abortedWith_; }

  // An exception must not pass through the library, and no event may follow the one that ended the
  // run, though the library may have some left (the end of an empty element).
  template <typename Event>
  void deliver(Event event) {
    if (isEnded()) return;
    try {
      event(owner.events_);
    } catch (...) {
      thrown = std::current_exception();
    }
    if (isEnded()) XML_StopParser(handle.get(), XML_FALSE);
  }

  // Ends the run, inside of deliver(), with a fault that the library does not see.
  void refuse(std::string_view description) {
    owner.abort(recordOf(XML_ERROR_AMPLIFICATION_LIMIT_BREACH,
                         std::string(description) + " at " + position()));
  }

  // Counts what a document with declarations delivers; false when it is too much.
  bool spend(std::size_t size, std::size_t& left) {
    if (!hasDeclarations) return true;
    if (size > left) {
      refuse(XML_ErrorString(XML_ERROR_AMPLIFICATION_LIMIT_BREACH));
      return false;
    }
    left -= size;
    return true;
  }

  bool spendOnElement(std::string_view name, const XML_Char* const* attributes) {
    if (!hasDeclarations) return true;
    std::size_t size = kSizeOfElement + name.size();
    for (const XML_Char* const* text = attributes; *text != nullptr; ++text) {
      size += std::string_view(*text).size() + 1;
    }
    return spend(size, elementsLeft);
  }

  static void XMLCALL declareEntity(void* pointer, const XML_Char* /*name*/, int isParameter,
                                    const XML_Char* value, int length, const XML_Char* /*base*/,
                                    const XML_Char* /*systemID*/, const XML_Char* /*publicID*/,
                                    const XML_Char* /*notation*/) {
    Run* const run = static_cast<Run*>(pointer);
    run->hasDeclarations = true;
    // Parameter entities are never resolved, nor are external ones, which have no value.
    if (isParameter != 0 || value == nullptr) return;
    const std::string_view text(value, static_cast<std::size_t>(length));
    if (text.find('&') == std::string_view::npos) return;
    if (++run->nestingEntities <= kNestingEntitiesLimit) return;
    run->deliver([&](XMLParserEvents&) { run->refuse("too many entities made of entities"); });
  }

  static void XMLCALL declareAttribute(void* pointer, const XML_Char* /*element*/,
                                       const XML_Char* /*name*/, const XML_Char* /*type*/,
                                       const XML_Char* /*value*/, int /*isRequired*/) {
    Run* const run = static_cast<Run*>(pointer);
    run->hasDeclarations = true;
    if (++run->declaredAttributes <= kDeclaredAttributesLimit) return;
    run->deliver([&](XMLParserEvents&) { run->refuse("too many declared attributes"); });
  }

  static void XMLCALL startElement(void* pointer, const XML_Char* name,
                                   const XML_Char** attributes) {
    Run* const run = static_cast<Run*>(pointer);
    run->deliver([&](XMLParserEvents& events) {
      if (!run->spendOnElement(name, attributes)) return;
      events.didStartElement(nameOf(name), XMLAttributes(attributes));
    });
  }

  static void XMLCALL endElement(void* run, const XML_Char* name) {
    static_cast<Run*>(run)->deliver(
        [&](XMLParserEvents& events) { events.didEndElement(nameOf(name)); });
  }

  static void XMLCALL characters(void* pointer, const XML_Char* characters, int length) {
    Run* const run = static_cast<Run*>(pointer);
    const std::string_view text(characters, static_cast<std::size_t>(length));
    run->deliver([&](XMLParserEvents& events) {
      if (run->spend(text.size(), run->textLeft)) events.foundCharacters(text);
    });
  }

  XMLParser& owner;
  std::string document;                  // emptied once the library has all of it
  std::size_t next = 0;                  // where in the document the next piece begins
  std::size_t given = kUTF8Mark.size();  // the bytes that the library has
  Position origin;  // of the library's first character, behind white space that is skipped
  std::unique_ptr<std::remove_pointer_t<XML_Parser>, ParserFreer> handle;
  std::exception_ptr thrown;     // by an event
  bool hasDeclarations = false;  // of entities or of attributes
  std::size_t nestingEntities = 0;
  std::size_t declaredAttributes = 0;
  std::size_t elementsLeft;
  std::size_t textLeft;
};

bool XMLParser::parse(ErrorSlot& error) {
  abortedWith_.reset();
  try {
    std::string document = std::move(bytes_);
    const std::optional<std::size_t> start = makeUTF8(document, error);
    if (!start) return false;

    Run run(*this, std::move(document), *start);
    const bool succeeded = run.feed();
    if (run.thrown) std::rethrow_exception(run.thrown);
    if (abortedWith_) {
      error = std::move(abortedWith_);
      return false;
    }
    if (!succeeded) error = run.fault();
    return succeeded;
  } catch (const std::bad_alloc&) {
    error = recordOf(XML_ERROR_NO_MEMORY, XML_ErrorString(XML_ERROR_NO_MEMORY));
    return false;
  }
}

std::string XMLParser::position() const {
  return run_ != nullptr ? run_->position() : std::string();
}

}  // namespace platform
