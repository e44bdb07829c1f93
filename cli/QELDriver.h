#pragma once

#include <span>

/// One whole run of the tool: scans the arguments (without the program's name), loads the source,
/// writes what the command asks for and returns the exit status, 0 or 1.
///
/// Every failure is one message on standard error. Null pointers do not occur among the arguments.
int QELRun(std::span<const char* const> arguments);
