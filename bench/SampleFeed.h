#pragma once

#include <string>

/// A feed of that many items in the shape of published ones: show notes in CDATA sections, in every
/// fourth item escaped instead, long descriptions, counted media URLs; about 2.3 KB for each item.
std::string sampleFeed(int items);
