#include "sources/QELReferenceFilePodcastSource.h"

#include <optional>
#include <string_view>
#include <utility>

#include "cli/common/QELError.h"
#include "model/QELPodcastKeys.h"
#include "platform/files/FileManager.h"
#include "platform/plist/PropertyListReader.h"

namespace {

using platform::Dictionary;
using platform::PropertyListValue;

/// The texts of a list; an element that is no text is left out. Absent when the key is missing or
/// holds no list.
std::optional<QELPodcastSource::FileTypes> fileTypesForKey(const Dictionary& dictionary,
                                                           std::string_view key) {
  const PropertyListValue* value = platform::valueForKey(dictionary, key);
  const PropertyListValue::Array* array = value ? value->asArray() : nullptr;
  if (!array) return std::nullopt;

  QELPodcastSource::FileTypes types;
  for (const PropertyListValue& element : *array) {
    if (const auto text = element.asText()) types.insert(text->string());
  }
  return types;
}

}  // namespace

std::shared_ptr<const Dictionary> QELSharedDictionary(
    const std::shared_ptr<const PropertyListValue>& value) {
  const Dictionary* dictionary = value ? value->asDictionary() : nullptr;
  if (!dictionary) return nullptr;
  return {value, dictionary};
}

std::unique_ptr<QELReferenceFilePodcastSource> QELReferenceFilePodcastSource::initWithPath(
    const std::string& path) {
  // What is wrong with the file is not told apart here.
  platform::ErrorSlot error;
  std::optional<platform::ByteSource> bytes = platform::openWholeFile(path, error);
  if (!bytes) return nullptr;
  std::optional<platform::PropertyListFault> fault;
  auto value = platform::readPropertyList(std::move(*bytes), fault);
  if (!value) return nullptr;
  return initWithDictionary(
      QELSharedDictionary(std::make_shared<const PropertyListValue>(std::move(*value))));
}

std::unique_ptr<QELReferenceFilePodcastSource> QELReferenceFilePodcastSource::initWithDictionary(
    std::shared_ptr<const Dictionary> dictionary) {
  if (!dictionary) return nullptr;
  return std::make_unique<QELReferenceFilePodcastSource>(std::move(dictionary));
}

bool QELReferenceFilePodcastSource::loadSourceWithError(platform::ErrorSlot& error) {
  if (!refData_) {
    error = QELError(1, "No reference file data was available");
    return false;
  }

  for (const QELPodcastKey& field : QELPodcastKeys()) {
    (this->*field.setValue)(platform::textForKey(*refData_, field.key));
  }
  const PropertyListValue* value = platform::valueForKey(*refData_, "Episodes");
  if (const PropertyListValue::Array* array = value ? value->asArray() : nullptr) {
    auto episodes = std::make_shared<QELEpisodeList>();
    episodes->reserve(array->size());
    for (const PropertyListValue& element : *array) {
      episodes->push_back(QELEpisode::episodeWithDictionary(element.asDictionary()));
    }
    setEpisodes(std::move(episodes));
  }
  setAllowedPosterFileTypes(fileTypesForKey(*refData_, "AllowedPosterTypes"));
  setAllowedEpisodeFileTypes(fileTypesForKey(*refData_, "AllowedEpisodeTypes"));
  return true;
}
