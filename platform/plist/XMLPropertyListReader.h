#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "platform/plist/PropertyListBuilder.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/plist/PropertyListValue.h"
#include "platform/xml/XMLParser.h"

namespace platform {

/// Reads the XML form of a property list, for readPropertyList.
class XMLPropertyListReader final : private XMLParserEvents {
 public:
  explicit XMLPropertyListReader(std::string bytes) : parser_(std::move(bytes), *this) {}

  /// Called once at most. Absent, with the fault, for bytes that are no such list.
  std::optional<PropertyListValue> read(std::optional<PropertyListFault>& fault);

 private:
  enum class Element;
  static std::optional<Element> elementNamed(std::string_view name);

  void didStartElement(const XMLName& name, const XMLAttributes& attributes) override;
  void didEndElement(const XMLName& name) override;
  void foundCharacters(std::string_view text) override;

  void startKey();
  void startValue(Element element);
  void startScalar(Element element);
  void endContainer();
  void endScalar();
  template <typename Value>
  void addUnlessAbsent(std::optional<Value> value, std::string_view faultIfAbsent);

  XMLParser parser_;
  PropertyListBuilder builder_;
  bool isInsideList_ = false;
  std::optional<Element> scalar_;  // the open element that holds text, not elements
  std::string text_;               // what it holds so far
};

}  // namespace platform
