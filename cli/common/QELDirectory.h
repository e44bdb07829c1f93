#pragma once

#include <string>

/// The podcast directory whose elements feeds carry: the prefix by which the elements are told
/// ("orvane:image"), and the namespace that a written feed declares for it.
struct QELDirectory {
  std::string prefix = "orvane";
  std::string uri = "https://orvane.example/ns/podcast-1.0";
};
