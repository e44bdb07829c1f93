#include <algorithm>
#include <optional>
#include <set>
#include <string>

#include "cli/common/QELReferenceType.h"
#include "fuzz/AskedHost.h"
#include "fuzz/FuzzTarget.h"
#include "generators/QELBundleNames.h"
#include "generators/QELNameLedger.h"
#include "platform/files/Paths.h"
#include "platform/net/URL.h"
#include "platform/text/Case.h"
#include "platform/text/Splitting.h"
#include "platform/text/Text.h"
#include "platform/xml/XMLEscaping.h"

namespace {

bool isPrintableASCII(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return c > ' ' && c <= '~'; });
}

void requireSoundURL(std::string_view text) {
  const std::optional<platform::URL> url = platform::URL::parse(text);
  if (!url) return;
  requireThat(!url->scheme().empty() && platform::lowercased(url->scheme()) == url->scheme(),
              "a scheme is in lower case");
  requireThat(isPrintableASCII(url->encodedText()) && isPrintableASCII(url->encodedPath()),
              "what is sent of a URL is printable ASCII");
  const std::optional<platform::URL> sent = platform::URL::parse(url->encodedText());
  requireThat(sent.has_value(), "what is sent of a URL is one");
  requireThat(sent->encodedText() == url->encodedText() && sent->scheme() == url->scheme() &&
                  sent->encodedPath() == url->encodedPath(),
              "what is sent of a URL is the same URL");
  const bool isHTTP = url->scheme() == "http" || url->scheme() == "https";
  if (isHTTP) {
    const Server shown = shownServer(text);
    requireThat(askedServer(url->encodedText()) == shown, "the host that is shown is asked");
  }
  requireThat(!(isHTTP || url->scheme() == "file") ||
                  QELReferenceType(text) == platform::Text(kReferenceTypeRemote),
              "what is fetched as a URL counts as remote");
}

/// Of a redirect's Location, whatever it looks like.
void requireSoundRedirect(std::string_view reference) {
  const platform::URL base = *platform::URL::parse("http://u:p@host:1/a/b?c");
  const std::optional<platform::URL> target = base.resolved(reference);
  if (!target || target->scheme() != "http") return;
  const bool hasScheme = reference.substr(0, reference.find_first_of("/?#")).ends_with(':');
  const bool showsHost = hasScheme || reference.starts_with("//");
  const Server shown = shownServer(showsHost ? reference : base.encodedText());
  requireThat(askedServer(target->encodedText()) == shown,
              "a redirect leads to the host that it shows, or stays");
}

void requirePathAsURL(std::string_view text) {
  std::string path = "/";
  path += text;
  const std::optional<platform::URL> url = platform::URL::parse(platform::fileURLText(path));
  requireThat(url.has_value() && url->scheme() == "file", "an absolute path has a file URL");
  requireThat(url->path() == path, "the path of a path's URL is that path");
}

void requireStandardised(std::string_view text) {
  const std::string path = platform::standardisedPath(text);
  // A tilde that was no user's at first may be one now.
  requireThat(path.starts_with('~') || platform::standardisedPath(path) == path,
              "a standardised path is standardised");
}

void requireSafe(const std::string& name) {
  requireThat(!name.empty() && name != "." && name != "..", "a name names a file");
  requireThat(name.size() <= 255, "a name is not longer than file systems allow");
  requireThat(name.find('/') == std::string::npos && name.find('\0') == std::string::npos,
              "a name is a single component of a path");
  requireThat(platform::isXMLText(name), "a reference file can hold a name");
  const std::string path = platform::joinedPath("/bundle", name);
  requireThat(platform::lastPathComponent(path) == name && path.size() == name.size() + 8 &&
                  platform::standardisedPath(path) == path,
              "a name leads to a file of its own in the bundle");
}

/// The names of one bundle's media and posters.
class Bundle {
 public:
  void add(const platform::Text& location, const platform::OptionalText& referenceType) {
    const std::optional<std::string> name = QELFileName({location, referenceType});
    if (!name) return;
    const std::string base = ledger_.reserve(QELBaseName(*name));
    requireThat(bases_.insert(base).second, "a base name is given out once");
    requireThat(base.find('/') == std::string::npos, "a base name holds no slash");
    const std::string extension(platform::pathExtension(*name));
    requireThat(extension.find('/') == std::string::npos, "an extension holds no slash");
    const std::string fileName = QELNameWithExtension(base, extension);
    if (!QELNamesFile(*name) || !QELIsSaneName(fileName)) return;
    requireSafe(fileName);
    requireThat(names_.insert(fileName).second, "no two files have one name");
    // Of a name that was all colons nothing else is left, and one dot that begins a name ends no
    // base.
    requireThat(platform::pathExtension(fileName) == extension || base.empty(),
                "a file keeps its extension");
  }

 private:
  QELNameLedger ledger_;
  std::set<std::string> bases_;
  std::set<std::string> names_;
};

}  // namespace

/// Each line is a location: as a URL, as a path, and as the media of one episode of a bundle,
/// remote, local or as its own text says.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text = inputText(data, size);
  Bundle bundle;
  for (const std::string_view line : platform::splitAt(text, '\n')) {
    requireSoundURL(line);
    requireSoundRedirect(line);
    requirePathAsURL(line);
    requireStandardised(line);
    bundle.add(line, QELReferenceType(line));
    bundle.add(line, platform::Text(kReferenceTypeRemote));
    bundle.add(line, platform::Text(kReferenceTypeLocal));
  }
  return 0;
}
