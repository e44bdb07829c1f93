#include "generators/QELReferenceFilePodcastGenerator.h"

#include <utility>

#include "model/QELPodcastKeys.h"

bool QELReferenceFilePodcastGenerator::generateFromSource(QELPodcastSource& source,
                                                          platform::ErrorSlot& /*error*/) {
  platform::Dictionary dictionary;
  QELAddPodcastKeys(QELPodcastKeys(), source, dictionary);

  if (const auto& episodes = source.episodes(); episodes && !episodes->empty()) {
    platform::PropertyListValue::Array array;
    array.reserve(episodes->size());
    for (const auto& episode : *episodes) array.emplace_back(episode->dictionary());
    dictionary.insert_or_assign("Episodes", std::move(array));
  }
  setReferenceData(std::make_shared<const platform::Dictionary>(std::move(dictionary)));
  return true;
}
