#pragma once

#include <span>

/// One whole run of qel-check: takes the command line (without the program's name) and returns the
/// exit status.
int QELRunCheck(std::span<const char* const> commandLine);
