#pragma once

#include <string>
#include <string_view>

#include "platform/files/FileDescriptor.h"
#include "platform/text/ErrorRecord.h"
#include "platform/text/FormattedText.h"

namespace platform {

/// Standard input read to its end, in chunks of whatever size is available. A read error ends it as
/// the end of the input does, and so does kWholeReadLimit.
std::string readStandardInput();

/// How texts are inserted into what standard output, or standard error, is to show: on a terminal a
/// control character would be obeyed, in a file or a pipe it is a byte like any other.
ControlCharacters controlsOfStandardOutput();
ControlCharacters controlsOfStandardError();

/// Writes to standard output through a buffer, which is flushed at line breaks on a terminal; where
/// the output is non-blocking, waits. Failures are not reported but where a slot is given for them.
void writeToStandardOutput(std::string_view text);
void flushStandardOutput();
/// The same; false, and the slot filled, when anything that was printed was not taken, now or
/// before. A reader that went away is no failure: it had enough.
bool flushStandardOutput(ErrorSlot& error);

/// Writes to standard error, unbuffered; failures are not reported.
void writeToStandardError(std::string_view text);

/// The path that stands for standard output where an output path is expected.
inline constexpr std::string_view kStandardOutputPath = "/dev/stdout";

/// An output path opened for writing, its content replaced or appended to. To replace waits for the
/// reader of a FIFO, as long as it takes; to append does not, and fails without one.
///
/// kStandardOutputPath is served by the already open standard output, behind anything printed
/// before, so that a shell's ">>" appends and a pipe or a socket will do. Failures to open or write
/// are not reported beyond the result of `write`.
class OutputFile {
 public:
  enum class Mode { kReplace, kAppend };
  OutputFile(const std::string& path, Mode mode);
  ~OutputFile() = default;
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;

  /// False when the file is not open or did not take all bytes, and from then on.
  bool write(std::string_view bytes);

 private:
  FileDescriptor file_;  // not open for standard output
  int descriptor_ = -1;  // -1 as well after a failure
};

}  // namespace platform
