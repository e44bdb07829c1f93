#pragma once

#include <string>

/// What a reader of the library finds wrong with a document ("mismatched tag"), and what to do
/// about it.
std::string QELWithAdvice(const std::string& fault);
