#include "companions/check/QELReferenceCheck.h"

#include <optional>
#include <string>
#include <utility>

#include "companions/common/QELFaultAdvice.h"
#include "companions/common/QELMediaType.h"
#include "model/QELReferenceKeys.h"
#include "platform/text/Case.h"

namespace {

class Check {
 public:
  explicit Check(QELFindings& findings) : findings_(findings) {}

  QELReferenceRecord record(const platform::PropertyListPart& part, bool isEpisode) {
    QELReferenceRecord record{part, isEpisode, {}, {}};
    for (const platform::PropertyListPart& entry : part.parts()) {
      if (!record.all.insert_or_assign(entry.key, entry).second) {
        warn(QELPlaceOfKey(entry),
             "the key %@ stands here for a second time, and only the last one counts: remove one",
             {QELQuoted(entry.key)});
      }
      if (isOfRightKind(entry, isEpisode)) record.sound.insert_or_assign(entry.key, entry);
    }
    return record;
  }

  void values(const QELReferenceRecord& record) {
    advisoryLabel(record.value(record.isEpisode ? "EpisodeAdvisoryLabel" : "PodcastAdvisoryLabel"));
    fileTypes(record.value("AllowedPosterTypes"));
    fileTypes(record.value("AllowedEpisodeTypes"));
    for (const std::string_view key : {"EpisodeOrder", "EpisodeFileSize"}) {
      const platform::PropertyListPart* const number = record.value(key);
      if (number != nullptr && *number->value->asSignedInteger() < 0) {
        warn(QELPlaceOf(*number),
             "a negative \"%@\" counts as missing: write 0 or more, or leave it out", {key});
      }
    }
    const platform::PropertyListPart* const type = record.value("EpisodeType");
    if (type != nullptr && !QELIsMediaType(type->text())) {
      warn(QELPlaceOf(*type), "%@ is no MIME type: write one such as audio/mpeg",
           {QELQuoted(type->text())});
    }
    if (record.isEpisode && !record.has("EpisodeReference")) {
      warn(QELPlaceOf(record.self),
           "this episode has no \"EpisodeReference\", and so no media: add their path or URL");
    }
  }

  void warn(const QELPlace& place, std::string_view format,
            std::initializer_list<platform::FormatArgument> arguments = {}) {
    findings_.add(QELSeverity::kWarning, place, format, arguments);
  }

 private:
  bool isOfRightKind(const platform::PropertyListPart& entry, bool isEpisode) {
    const std::string name = QELQuoted(entry.key);
    const std::string_view owner = isEpisode ? "an episode" : "a podcast";
    const QELReferenceKey* const key = QELReferenceKeyNamed(entry.key);
    if (!key) {
      if (const QELReferenceKey* likely = QELLikeliestReferenceKey(entry.key, isEpisode)) {
        warn(QELPlaceOfKey(entry), "%@ is no key of %@, and is ignored; is it meant to be \"%@\"?",
             {name, owner, likely->name});
      } else {
        warn(QELPlaceOfKey(entry), "%@ is no key of %@, and is ignored: correct it or leave it out",
             {name, owner});
      }
    } else if (key->isOfEpisode() != isEpisode) {
      warn(QELPlaceOfKey(entry), "%@ is a key of %@, and is ignored in %@: move it there",
           {name, isEpisode ? "a podcast" : "an episode", owner});
    } else if (entry.kind() != key->kind) {
      const std::string_view noun = key->kind.substr(key->kind.find(' ') + 1);
      warn(QELPlaceOfKey(entry), "%@ must be %@, not %@: write it in <%@>",
           {name, key->kind, entry.kind(), noun == "text" ? "string" : noun});
    } else {
      return true;
    }
    return false;
  }

  void advisoryLabel(const platform::PropertyListPart* label) {
    if (!label) return;
    const std::string text = platform::lowercased(label->text());
    if (text == "explicit" || text == "yes" || text == "clean") return;
    warn(QELPlaceOf(*label),
         "the advisory label %@ is in no feed: write \"Explicit\" or \"Clean\", or leave it out",
         {QELQuoted(label->text())});
  }

  void fileTypes(const platform::PropertyListPart* types) {
    if (!types) return;
    for (const platform::PropertyListPart& type : types->parts()) {
      if (type.kind() != "a text") {
        warn(QELPlaceOf(type), "a file type must be a text, not %@: write it in <string>",
             {type.kind()});
        continue;
      }
      const std::string_view text = type.text();
      const std::string shown = QELQuoted(text);
      if (text.find('/') != std::string_view::npos) {
        warn(QELPlaceOf(type), "%@ allows nothing: an extension counts, such as \"mp3\"", {shown});
      } else if (text.starts_with('.')) {
        warn(QELPlaceOf(type), "%@ allows nothing: leave its dot out", {shown});
      } else if (text != platform::lowercased(text)) {
        warn(QELPlaceOf(type), "%@ allows nothing: write it in lower case", {shown});
      }
    }
  }

  QELFindings& findings_;
};

}  // namespace

void QELCheckReferenceFile(platform::ByteSource bytes, QELFindings& findings,
                           const std::function<void(const QELReferenceRecord&)>& receive) {
  std::optional<platform::PropertyListFault> fault;
  platform::PropertyListPlaces places;
  const auto value = platform::readPropertyList(std::move(bytes), fault, &places);
  if (!value) {
    const std::string object = fault->object ? "object " + std::to_string(*fault->object) : "";
    return findings.add(QELSeverity::kError, {.position = fault->position, .path = object}, "%@",
                        {QELWithAdvice(fault->description)});
  }
  const platform::PropertyListPart root{.value = &*value, .places = &places};
  if (!value->asDictionary()) {
    findings.add(QELSeverity::kError, QELPlaceOf(root),
                 "the value of a reference file must be a dictionary, not %@: put it into <dict>",
                 {root.kind()});
    return;
  }
  Check check(findings);
  const QELReferenceRecord podcast = check.record(root, false);
  check.values(podcast);
  receive(podcast);
  const platform::PropertyListPart* const episodes = podcast.value("Episodes");
  if (!episodes) return;
  for (const platform::PropertyListPart& part : episodes->parts()) {
    if (!part.value->asDictionary()) {
      check.warn(QELPlaceOf(part), "an episode must be a dictionary, not %@: put it into <dict>",
                 {part.kind()});
      continue;
    }
    const QELReferenceRecord episode = check.record(part, true);
    check.values(episode);
    receive(episode);
  }
}
