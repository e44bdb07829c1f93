#pragma once

#include <span>

/// One whole run of qel-keep: takes the command line (without the program's name) and returns the
/// exit status.
int QELRunKeep(std::span<const char* const> commandLine);
