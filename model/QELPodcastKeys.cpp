#include "model/QELPodcastKeys.h"

#include <array>
#include <cstddef>
#include <string>

namespace {

using Source = QELPodcastSource;

constexpr auto kKeys = std::to_array<QELPodcastKey>({
    {"PodcastUUID", "QELUUID", &Source::uuid, &Source::setUuid},
    {"PodcastName", "title", &Source::title, &Source::setTitle},
    {"PodcastAuthor", "author", &Source::author, &Source::setAuthor},
    {"PodcastCopyright", "copyright", &Source::copyright, &Source::setCopyright},
    {"PodcastKeywords", "keywords", &Source::keywords, &Source::setKeywords},
    {"PodcastCategory", "category", &Source::category, &Source::setCategory},
    {"PodcastDescription", "description", &Source::podcastDescription,
     &Source::setPodcastDescription},
    {"PodcastAdvisoryLabel", "advisoryLabel", &Source::advisoryLabel, &Source::setAdvisoryLabel},
    {"PodcastReference", "url", &Source::location, &Source::setLocation},
    {"PodcastReferenceType", "", &Source::referenceType, &Source::setReferenceType},
    {"PodcastPosterReference", "poster", &Source::posterLocation, &Source::setPosterLocation},
    {"PodcastPosterReferenceType", "", &Source::posterReferenceType,
     &Source::setPosterReferenceType},
});
constexpr std::size_t kDescriptiveKeyCount = 8;

}  // namespace

std::span<const QELPodcastKey> QELPodcastKeys() {
  return kKeys;
}

std::span<const QELPodcastKey> QELPodcastDescriptiveKeys() {
  return std::span(kKeys).first(kDescriptiveKeyCount);
}

void QELAddPodcastKeys(std::span<const QELPodcastKey> keys, const QELPodcastSource& source,
                       platform::Dictionary& dictionary) {
  for (const QELPodcastKey& field : keys) {
    if (const auto& value = (source.*field.value)()) dictionary.insert_or_assign(field.key, *value);
  }
}
