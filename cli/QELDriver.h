#pragma once

#include <span>

#include "cli/QELArguments.h"

class QELBundlePodcastGenerator;
class QELFeedPodcastGenerator;
class QELPodcastSource;
class QELReferenceFilePodcastGenerator;

/// One whole run of the tool: scans the command line (without the program's name), loads the
/// source, writes what the command asks for and returns the exit status, 0 or 1.
///
/// Every failure is one message on standard error, where that is a terminal with U+FFFD for the
/// control characters of inserted texts. Null pointers do not occur among the arguments.
int QELRun(std::span<const char* const> commandLine);

/// The part of a run that has its source: loads it and carries out the command. The exit status.
int QELRunCommand(const QELArguments& arguments, QELPodcastSource& source);

/// The part of a run that has its loaded source and the new generator of its command: has it
/// generate and writes what it made. The exit status.
int QELCreateBundle(const QELArguments& arguments, QELPodcastSource& source,
                    QELBundlePodcastGenerator& generator);
int QELCreateFeed(const QELArguments& arguments, QELPodcastSource& source,
                  QELFeedPodcastGenerator& generator);
int QELParseFeed(const QELArguments& arguments, QELPodcastSource& source,
                 QELReferenceFilePodcastGenerator& generator);
