#pragma once

#include <memory>
#include <string>

#include "cli/common/QELDirectory.h"
#include "model/QELPodcastSource.h"
#include "platform/text/ErrorRecord.h"

/// Whether a source, as a user names it, lies on the network, and so was written by strangers.
bool QELIsOnNetwork(const std::string& source);

/// Whether the file is the source itself, or the reference file of one that is a bundle.
bool QELIsSourceItself(const std::string& file, const std::string& source);

/// The name of a source, or of a file of one, by which it is found from any working directory: a
/// URL as it is, and of a path the absolute one without "." and "..". Links keep their names but
/// for those that a ".." comes behind. A relative path stays as it is when the working directory
/// cannot be told.
std::string QELLastingName(const std::string& source);

/// The source that the name stands for, loaded, with the elements of the podcast directory read
/// under that one's prefix. Unlike those of a bundle source as such, posters of a bundle's episodes
/// have paths that lead to them, and the relative paths of a reference file are taken to begin in
/// its directory, so that they lead to the same from any working directory. A feed's server that
/// sends no byte for `stallLimit` seconds is given up. Null, and the slot filled, when it cannot be
/// loaded.
std::unique_ptr<QELPodcastSource> QELLoadedSource(const std::string& source,
                                                  const QELDirectory& directory, int stallLimit,
                                                  platform::ErrorSlot& error);
