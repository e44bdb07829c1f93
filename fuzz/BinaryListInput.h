#pragma once

#include <string>
#include <string_view>

/// The binary property list that an input stands for.
///
/// One that begins like such a list is taken as it is. Of any other, each first byte gives the size
/// of the object that follows it, and header, table and trailer are put around these objects, the
/// first of which is the root: the table of a whole list would not survive most changes, and all
/// that lies behind it would hardly be reached.
std::string binaryListOf(std::string_view input);
