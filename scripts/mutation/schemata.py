"""Writes sources that hold many faults at once, of which a run chooses one by the environment variable QEL_MUTANT.

Where the variable QEL_REACHED names a file, a run sets a byte of it for each fault that it could have met: that at the
fault's number.
"""

MOST_FAULTS = 1 << 16

# Calls the system itself: the tests look at what the product calls, and let it fail.
SWITCH = f"""\
#pragma once
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <unistd.h>
#include <cstdlib>
#include <type_traits>
inline const int qelMutant = [] {{
  const char* number = std::getenv("QEL_MUTANT");
  return number != nullptr ? std::atoi(number) : 0;
}}();
inline unsigned char* const qelReached = []() -> unsigned char* {{
  const char* path = std::getenv("QEL_REACHED");
  const long file = path != nullptr ? ::syscall(SYS_openat, AT_FDCWD, path, O_RDWR | O_CLOEXEC) : -1;
  if (file < 0) return nullptr;
  const long place = ::syscall(SYS_mmap, nullptr, {MOST_FAULTS}, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0L);
  ::syscall(SYS_close, file);
  return place != -1 ? reinterpret_cast<unsigned char*>(place) : nullptr;
}}();
inline bool qelIsChosen(int number) {{
  if (qelReached != nullptr) qelReached[number] = 1;
  return qelMutant == number;
}}
"""


def _nested(sites):
    """The outermost of the sites; each holds those within it. Expressions lie within each other or apart."""
    roots = []
    around = []
    for site in sorted(sites, key=lambda one: (one.start, -one.end, one.kind != "statement", one.kind != "condition")):
        site.children = []
        while around and around[-1].end <= site.start:
            around.pop()
        (around[-1].children if around else roots).append(site)
        around.append(site)
    return roots


def _rendered(source, start, end, sites, numbers):
    text = b""
    for site in sites:
        kept = _rendered(source, site.start, site.end, site.children, numbers).decode()
        is_chosen = f"qelIsChosen({numbers[site.name]})"
        if site.may_be_constant:
            is_chosen = f"!std::is_constant_evaluated() && {is_chosen}"
        text += source[start:site.start]
        text += f"(({is_chosen}) ? ({site.after}) : {site.kept.replace('{}', kept)})".encode()
        start = site.end
    return text + source[start:end]


def with_faults(source, sites, numbers):
    """The bytes of a source with the sites' faults in it, line for line; `numbers` says which value chooses a site."""
    return _rendered(source, 0, len(source), _nested(sites), numbers)
