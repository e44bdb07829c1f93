#pragma once

#include <initializer_list>
#include <string_view>

/// What a run under faults did, line by line in a file; fields stand between tabs:
///
///     call   KIND PATH         a call that was counted, and passed
///     fault  KIND PATH ERRNO   one that was made to fail
///     frames TEXT              who asked for the memory that was refused
///     leak   DESCRIPTOR        a descriptor that was still open at the end
///     end    COUNT             the run came to its ordinary end; how many allocations it made
///
/// Written without the C library, whose own calls are being counted.
class RunLog {
 public:
  /// Appends to the file from now on. The descriptor is a high one, so that the run's own get the
  /// numbers that they get without the log. False when it cannot be opened.
  static bool open(const char* path);
  static void line(std::initializer_list<std::string_view> fields);
  /// The log's own descriptor, -1 without a log.
  static int descriptor();
};
