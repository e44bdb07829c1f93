#include "generators/QELBundleDirectory.h"

#include <string_view>
#include <utility>

#include "generators/QELBundleNames.h"
#include "platform/files/FileManager.h"
#include "platform/files/Paths.h"
#include "platform/files/PortablePaths.h"
#include "platform/files/RegularFile.h"
#include "platform/files/TemporaryFile.h"
#include "platform/plist/PropertyListReader.h"
#include "platform/plist/PropertyListWriter.h"
#include "platform/text/Case.h"

using platform::Directory;
using platform::ErrorSlot;
using platform::FileIdentity;
using platform::FilePlace;

bool QELBundleDirectory::open(const std::string& path, ErrorSlot& error, Directory::Wait wait) {
  // The directory that was waited for may have been renamed or removed meanwhile.
  do {
    if (!platform::createDirectories(path, error)) return false;
    std::optional<Directory> opened = Directory::open(path, error);
    if (!opened) return false;
    bundle_ = std::move(*opened);
    if (bundle_.lock(wait) == Directory::Lock::kHeldByAnother) {
      error = platform::ErrorRecord{"QELDomain", 2, "Another run is filling it"};
      return false;
    }
  } while (bundle_.isLocked() && !bundle_.isAt(path));
  platform::removeStaleTemporaryFiles(bundle_);

  ErrorSlot ignored;  // a poster that then cannot be saved is warned about
  posters_ = bundle_.openOrMake(std::string(kPostersName), ignored).value_or(Directory());
  platform::removeStaleTemporaryFiles(posters_);
  return true;
}

std::optional<platform::Dictionary> QELBundleDirectory::readReferenceFile(const std::string& path,
                                                                          ErrorSlot& error) {
  const std::string file = platform::joinedPath(path, kReferenceFileName);
  if (!platform::fileExists(file)) return platform::Dictionary();
  std::optional<platform::ByteSource> bytes = platform::openWholeFile(file, error);
  if (!bytes) return std::nullopt;
  std::optional<platform::PropertyListFault> fault;
  const auto value = platform::readPropertyList(std::move(*bytes), fault);
  if (value && value->asDictionary()) return *value->asDictionary();
  const std::string cause = fault ? fault->description : "no dictionary at its root";
  error = platform::ErrorRecord{"QELDomain", 1, "Info.plist: " + cause};
  return std::nullopt;
}

std::optional<std::uint64_t> QELBundleDirectory::sizeOfFile(
    const std::string& path, const platform::OptionalText& reference) {
  const auto name = reference ? platform::pathInside(*reference) : std::nullopt;
  if (!name || name->empty() || *name == kReferenceFileName) return std::nullopt;
  ErrorSlot ignored;
  const auto file = platform::RegularFile::open(platform::joinedPath(path, *name), ignored);
  return file && file->size() > 0 ? std::optional(file->size()) : std::nullopt;
}

std::optional<FilePlace> QELBundleDirectory::mediaPlace(const std::string& name) const {
  if (!QELIsSaneName(name) || name == kReferenceFileName) return std::nullopt;
  return FilePlace(bundle_, name);
}

std::optional<FilePlace> QELBundleDirectory::posterPlace(const std::string& name) const {
  const bool leavesBundle = !posters_.isOpen() && bundle_.containsLink(std::string(kPostersName));
  if (!QELIsSaneName(name) || leavesBundle) return std::nullopt;
  return FilePlace(posters_, name);
}

bool QELBundleDirectory::save(const FilePlace& place, const std::function<bool()>& put) {
  if (isInUse(place) || !put()) return false;
  const std::optional<FileIdentity> identity = place.directory->identity(place.name);
  if (!identity) return true;
  if (identity == bundle_.identity(std::string(kReferenceFileName))) {
    ErrorSlot ignored;
    place.directory->remove(place.name, ignored);
    return false;
  }
  saved_.insert_or_assign(*identity, place);
  savedNames_.insert_or_assign({place.directory, platform::caseFolded(place.name)}, place.name);
  return true;
}

bool QELBundleDirectory::isInUse(const FilePlace& place) const {
  const std::optional<FileIdentity> identity = place.directory->identity(place.name);
  if (!identity) return false;
  if (identity == bundle_.identity(std::string(kReferenceFileName))) return true;
  const auto spelling = savedNames_.find({place.directory, platform::caseFolded(place.name)});
  if (spelling != savedNames_.end() && spelling->second != place.name &&
      place.directory->identity(spelling->second) == identity) {
    return true;
  }
  const auto found = saved_.find(*identity);
  if (found == saved_.end()) return false;
  // The number of a file that was removed since may have been given to a stranger's.
  const FilePlace& other = found->second;
  const bool isSamePlace = other.directory == place.directory && other.name == place.name;
  return !isSamePlace && other.directory->identity(other.name) == identity;
}

bool QELBundleDirectory::writeReferenceFile(const platform::Dictionary& dictionary,
                                            ErrorSlot& error) {
  const std::string name(kReferenceFileName);
  platform::TemporaryFile file;
  return file.create({bundle_, name}, error, bundle_.attributesForSuccessor(name)) &&
         platform::writePropertyList(
             dictionary, [&](std::string_view bytes) { return file.write(bytes, error); }) &&
         syncFiles(error) && file.commitReplacing(error) && bundle_.sync(error);
}

/// The directories that were made, and the reference file in the making, are on the bundle's file
/// system as well.
bool QELBundleDirectory::syncFiles(ErrorSlot& error) const {
  return bundle_.syncFileSystem(error) &&
         (!posters_.isOpen() || posters_.isOnFileSystemOf(bundle_) ||
          posters_.syncFileSystem(error));
}
