#include "companions/check/QELBundleCheck.h"

#include <array>
#include <optional>
#include <vector>

#include "companions/check/QELPublishingCheck.h"
#include "companions/check/QELReferenceCheck.h"
#include "companions/common/QELSourceLoading.h"
#include "platform/files/FileKind.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/PortablePaths.h"
#include "platform/files/RegularFile.h"
#include "platform/net/URLFault.h"
#include "platform/text/Case.h"

void QELBundleCheck::check(platform::ByteSource bytes) {
  // It may be the working directory.
  if (platform::lowercased(platform::pathExtension(QELLastingName(directory_))) != "podcast") {
    findings_.add(QELSeverity::kWarning, {.file = directory_},
                  "qel takes a directory for a bundle when its name ends in .podcast: rename it");
  }
  bool isRead = false;
  QELCheckReferenceFile(std::move(bytes), findings_, [&](const QELReferenceRecord& record) {
    isRead = true;
    if (record.isEpisode) checkListed(record, "EpisodeReference");
    checkListed(record, record.isEpisode ? "EpisodePosterReference" : "PodcastPosterReference");
    if (isForPublishing_) QELCheckForPublishing(record, findings_, true);
  });
  if (isRead) checkKept();
}

void QELBundleCheck::checkListed(const QELReferenceRecord& record, std::string_view key) {
  const platform::PropertyListPart* const location = record.value(key);
  if (!location) return;
  const bool isMedia = key == "EpisodeReference";
  const std::string shown = QELQuoted(location->text());
  const std::optional<std::string> name = platform::pathInside(location->text());
  const auto add = [&](QELSeverity severity, std::string_view format) {
    findings_.add(severity, QELPlaceOf(*location), format, {shown});
  };
  if (platform::looksLikeURL(location->text())) {
    add(QELSeverity::kWarning,
        "%@ is a URL, but all files of a bundle lie in it: qel-keep fetches them into one");
  } else if (!name) {
    add(QELSeverity::kError, "%@ leads out of the bundle: move the file into it");
  } else if (name->empty()) {
    add(QELSeverity::kError, "%@ names no file: write its name, or leave the key out");
  } else {
    const bool isNew = listed_.insert(*name).second;
    if (!isNew && isMedia) {
      add(QELSeverity::kWarning, "%@ is listed for a second time: each episode has its own file");
    }
    checkFile(*location, *name, isMedia ? record.value("EpisodeFileSize") : nullptr);
  }
}

void QELBundleCheck::checkFile(const platform::PropertyListPart& location, const std::string& name,
                               const platform::PropertyListPart* size) {
  const std::string shown = QELQuoted(location.text());
  const auto fail = [&](std::string_view format,
                        std::initializer_list<platform::FormatArgument> arguments) {
    findings_.add(QELSeverity::kError, QELPlaceOf(location), format, arguments);
  };
  const std::string path = platform::joinedPath(directory_, name);
  platform::ErrorSlot error;
  std::optional<platform::RegularFile> file = platform::RegularFile::open(path, error);
  constexpr std::size_t kHeadSize = 512;
  std::array<char, kHeadSize> head{};
  std::optional<std::size_t> count;
  if (file) count = file->read(head, error);
  if (!count && !platform::fileExists(path)) {
    return fail("%@ is listed and missing: put it back, or let qel-keep fetch it again", {shown});
  }
  if (!count) return fail("%@ cannot be read: %@", {shown, error->description});
  if (!platform::liesBelow(path, directory_)) {
    fail("%@ leads out of the bundle by a link: put the file itself in its place", {shown});
  }
  const auto kind = platform::kindOfBytes(std::string_view(head.data(), *count));
  const std::string_view extension = platform::pathExtension(name);
  if (*count == 0) {
    fail("%@ is empty: remove it, and let qel-keep fetch it again", {shown});
  } else if (kind == platform::kHTMLPage && !platform::isExtensionOfKind(extension, *kind)) {
    fail("%@ is a page of HTML, which a server sent in its place: remove it, and fetch it again",
         {shown});
  } else if (kind && !platform::isExtensionOfKind(extension, *kind)) {
    findings_.add(QELSeverity::kWarning, QELPlaceOf(location),
                  "%@ is %@ by its first bytes: rename it, here and in its directory",
                  {shown, *kind});
  }
  const std::uint64_t expected = size ? size->value->asUnsignedInteger().value_or(0) : 0;
  if (expected != 0 && expected != file->size()) {
    findings_.add(QELSeverity::kNote, QELPlaceOf(*size),
                  "%@ has %lu bytes, and not %lu: feeds made of the bundle say the latter",
                  {shown, file->size(), expected});
  }
}

void QELBundleCheck::checkKept() {
  platform::ErrorSlot error;
  const auto names = platform::filesBelow(directory_, error);
  for (const std::string& name : names.value_or(std::vector<std::string>())) checkName(name);
  if (names) return;
  findings_.add(QELSeverity::kError, {.file = directory_}, "its files cannot be listed: %@",
                {error->description});
}

void QELBundleCheck::checkName(const std::string& name) {
  const QELPlace place{.file = platform::joinedPath(directory_, name)};
  const auto warn = [&](std::string_view format,
                        std::initializer_list<platform::FormatArgument> arguments = {}) {
    findings_.add(QELSeverity::kWarning, place, format, arguments);
  };
  const std::string_view last = platform::lastPathComponent(name);
  if (last.starts_with('.')) {
    return last.starts_with(".qel-")  // of the tool, or of qel-keep
               ? warn("a run that did not end left this behind: remove it, or run qel-keep again")
               : warn("a hidden file, which is no part of the bundle: remove it");
  }
  const auto [other, isNew] = kept_.emplace(platform::caseFolded(name), name);
  if (!isNew) {
    warn(
        "its name differs from %@ in capitals alone, which other file systems take for one: "
        "rename it, here and in Info.plist",
        {QELQuoted(other->second)});
  }
  if (!platform::isPortablePath(name)) {
    warn("other file systems have no such name: rename it, here and in Info.plist");
  }
  if (name != "Info.plist" && !listed_.contains(name)) {
    warn("nobody lists this file: remove it, or add it to Info.plist");
  }
}
