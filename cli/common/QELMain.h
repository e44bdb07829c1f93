#pragma once

#include <span>

/// What every program's main does: prepares the process, hands the arguments (without the program's
/// name) to the driver function, and returns the exit status.
int QELMain(int argumentCount, char** arguments, int (*run)(std::span<const char* const>));
