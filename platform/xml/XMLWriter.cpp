#include "platform/xml/XMLWriter.h"

#include "platform/xml/XMLEscaping.h"

namespace platform {

XMLElement XMLElement::appendChild(std::string_view name) const {
  writer_->startElement(depth_, name);
  writer_->open_.push_back(name);
  writer_->isTagOpen_ = true;
  return {*writer_, depth_ + 1};
}

void XMLElement::appendChild(std::string_view name, std::string_view text) const {
  writer_->startElement(depth_, name);
  writer_->output_ += '>';
  appendEscapedText(writer_->output_, text);
  writer_->output_.append("</").append(name).append(">\n");
}

void XMLElement::appendAttribute(std::string_view name, std::string_view value) const {
  writer_->output_.append(" ").append(name).append("=\"");
  appendEscapedAttribute(writer_->output_, value);
  writer_->output_ += '"';
}

void XMLElement::endWithText(std::string_view text) const {
  writer_->output_ += '>';
  appendEscapedText(writer_->output_, text);
  writer_->output_.append("</").append(writer_->open_.back()).append(">\n");
  writer_->open_.pop_back();
  writer_->isTagOpen_ = false;
}

XMLWriter::XMLWriter(std::string& output, Layout layout) : output_(output), layout_(layout) {
  output_ += "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";
}

XMLElement XMLWriter::appendRoot(std::string_view name) {
  return XMLElement(*this, 0).appendChild(name);
}

void XMLWriter::startElement(std::size_t depth, std::string_view name) {
  endElements(depth);
  if (isTagOpen_) output_ += ">\n";
  isTagOpen_ = false;
  indent();
  output_ += '<';
  output_ += name;
}

void XMLWriter::endElements(std::size_t depth) {
  while (open_.size() > depth) {
    const std::string_view name = open_.back();
    open_.pop_back();
    if (isTagOpen_) {
      output_ += layout_.emptyTagEnd;
      output_ += '\n';
      isTagOpen_ = false;
    } else {
      indent();
      output_.append("</").append(name).append(">\n");
    }
  }
}

void XMLWriter::indent() {
  output_.append(open_.size() * layout_.indentationWidth, layout_.indentation);
}

}  // namespace platform
