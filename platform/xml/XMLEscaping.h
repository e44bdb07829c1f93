#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace platform {

/// Whether XML 1.0 can hold the text whole: UTF-8 without the characters that it excludes.
bool isXMLText(std::string_view text);

/// The text as it is read back once it was written: without what XML 1.0 cannot hold.
std::string textReadBack(std::string_view text);

/// Appends the text to `output`, escaped for the content of an XML 1.0 element so that a parser
/// reads back the very same text: markup characters and carriage returns as references. Characters
/// that XML 1.0 cannot hold and bytes that are no UTF-8 are left out.
void appendEscapedText(std::string& output, std::string_view text);

/// The same for an attribute value in double quotes: tabs, line breaks and double quotes as
/// references too.
void appendEscapedAttribute(std::string& output, std::string_view value);

/// By how much the text grows, at the most, when it is escaped.
std::size_t sizeOfReferences(std::string_view text);

}  // namespace platform
