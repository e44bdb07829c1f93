#pragma once

#include <span>

/// One whole run of qel-publish: takes the command line (without the program's name) and returns
/// the exit status.
int QELRunPublish(std::span<const char* const> commandLine);
