#include "fuzz/FuzzTarget.h"

#include <cstdlib>
#include <iostream>

#include "platform/xml/XMLEscaping.h"

void requireThat(bool holds, std::string_view invariant) {
  if (holds) return;
  std::cerr << "This does not hold: " << invariant << std::endl;
  std::abort();
}

void requireTold(const platform::ErrorSlot& error) {
  requireThat(error.has_value(), "a refusal tells its cause");
  const std::string_view description = error->description;
  requireThat(!error->domain.empty() && !description.empty(), "a cause has a domain and a text");
  requireThat(!description.ends_with('.') && description.find('\n') == std::string_view::npos,
              "a cause is one line without a full stop");
  requireThat(platform::isXMLText(description), "a cause can be shown");
}
