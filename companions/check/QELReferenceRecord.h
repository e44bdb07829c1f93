#pragma once

#include <map>
#include <string_view>

#include "companions/common/QELFindings.h"
#include "platform/plist/PropertyListPart.h"

/// A dictionary of a reference file: the podcast, or an episode.
struct QELReferenceRecord {
  platform::PropertyListPart self;
  bool isEpisode = false;
  std::map<std::string_view, platform::PropertyListPart> sound;  // of the type their keys ask for
  std::map<std::string_view, platform::PropertyListPart> all;    // of equal keys the last one

  /// The value of the key; null when it is missing or has another type than it should.
  const platform::PropertyListPart* value(std::string_view key) const {
    const auto found = sound.find(key);
    return found == sound.end() ? nullptr : &found->second;
  }
  bool has(std::string_view key) const { return all.contains(key); }
};

/// Where findings about a value, or about its key, belong.
inline QELPlace QELPlaceOf(const platform::PropertyListPart& part) {
  return {.position = part.position(), .path = part.path};
}
inline QELPlace QELPlaceOfKey(const platform::PropertyListPart& part) {
  return {.position = part.keyPosition(), .path = part.path};
}
