#include "fuzz/FuzzTarget.h"

#include <cstdlib>
#include <iostream>

#include "platform/xml/XMLEscaping.h"

void requireThat(bool holds, std::string_view invariant) {
  if (holds) return;
  std::cerr << "This does not hold: " << invariant << std::endl;
  std::abort();
}

void requireShowable(std::string_view description) {
  requireThat(!description.empty() && !description.ends_with('.') &&
                  description.find('\n') == std::string_view::npos,
              "a cause is one line without a full stop");
  requireThat(platform::isXMLText(description), "a cause can be shown");
}
