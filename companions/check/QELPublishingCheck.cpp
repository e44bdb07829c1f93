#include "companions/check/QELPublishingCheck.h"

#include "cli/common/QELReferenceType.h"
#include "model/QELEpisodeMatching.h"

void QELCheckForPublishing(const QELReferenceRecord& record, QELFindings& findings,
                           bool isInBundle) {
  const QELPlace place = QELPlaceOf(record.self);
  const auto demand = [&](std::string_view key, std::string_view lack) {
    if (!record.has(key)) findings.add(QELSeverity::kWarning, place, lack);
  };
  if (!record.isEpisode) {
    demand("PodcastName", "the show has no title: add \"PodcastName\"");
    demand("PodcastDescription", "the show has no description: add \"PodcastDescription\"");
    demand("PodcastReference",
           "the show has no home page, which readers show as its link: add \"PodcastReference\", "
           "or give it to qel-publish by --link");
    demand("PodcastPosterReference", "the show has no poster: add \"PodcastPosterReference\"");
    findings.add(QELSeverity::kNote, place,
                 "a reference file has no language: give it to qel-publish by --language");
    return;
  }
  demand("EpisodeName", "this episode has no title: add \"EpisodeName\"");
  demand("EpisodeDate", "this episode has no date, by which readers sort: add \"EpisodeDate\"");
  const auto identifies = [](const platform::PropertyListPart* part) {
    return part != nullptr && QELIsIdentifier(part->text());
  };
  const platform::PropertyListPart* const location = record.value("EpisodeReference");
  if (!identifies(record.value("EpisodeUUID")) && identifies(location)) {
    findings.add(
        QELSeverity::kNote, place,
        "this episode has no \"EpisodeUUID\", so the URL of its media becomes its guid, and "
        "readers show it again when that changes: add one");
  }
  if (!location || isInBundle) return;
  const platform::PropertyListPart* const type = record.value("EpisodeReferenceType");
  const bool isRemote = type ? type->text() == kReferenceTypeRemote
                             : QELReferenceType(location->text()) == kReferenceTypeRemote;
  if (isRemote) {
    demand("EpisodeFileSize",
           "the size of this episode's media is not known: add \"EpisodeFileSize\", in bytes");
  } else {
    findings.add(QELSeverity::kNote, QELPlaceOf(*location),
                 "%@ is a path: qel-publish makes it a URL with --base",
                 {QELQuoted(location->text())});
  }
}
