#pragma once

#include <memory>
#include <string>

#include "model/QELPodcastSource.h"
#include "platform/plist/PropertyListValue.h"

/// The podcast of the sample feed with that many items, loaded.
std::unique_ptr<QELPodcastSource> samplePodcast(int items);

/// The same as a reference dictionary.
std::shared_ptr<const platform::Dictionary> sampleReference(int items);

/// The same as a reference file in its XML form.
std::string sampleReferenceFile(int items);
