#pragma once

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "companions/common/QELFindings.h"
#include "platform/files/StandardStreams.h"

/// The lines that the findings print, but for those that tell numbers of a feed.
inline std::vector<std::string> printedFindings(QELFindings& findings) {
  testing::internal::CaptureStdout();
  findings.print();
  platform::flushStandardOutput();
  std::istringstream output(testing::internal::GetCapturedStdout());
  std::vector<std::string> lines;
  for (std::string line; std::getline(output, line);) {
    if (line.find(": note: qel takes ") == std::string::npos &&
        line.find(": note: taken: ") == std::string::npos &&
        line.find(": note: not taken: ") == std::string::npos) {
      lines.push_back(line);
    }
  }
  return lines;
}
