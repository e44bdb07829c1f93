#pragma once

#include <string_view>

/// A key of reference files, and what its value must be ("a text", see PropertyListPart).
struct QELReferenceKey {
  std::string_view name;
  std::string_view kind;
  bool isOfEpisode() const { return name.starts_with("Episode") && name != "Episodes"; }
};

/// The key of that name: one that the tool reads, or by which qel-keep remembers where things came
/// from. Null when there is none.
const QELReferenceKey* QELReferenceKeyNamed(std::string_view name);

/// The key of an episode, or of a podcast, that a misspelt one is meant to be: at most two letters
/// are wrong, missing or too many. Null when it is like none.
const QELReferenceKey* QELLikeliestReferenceKey(std::string_view name, bool isOfEpisode);
