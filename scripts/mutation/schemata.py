"""Writes sources that hold many faults at once, of which a run chooses one by the environment variable QEL_MUTANT."""

SWITCH = """\
#pragma once
#include <cstdlib>
#include <type_traits>
inline const int qelMutant = [] {
  const char* number = std::getenv("QEL_MUTANT");
  return number != nullptr ? std::atoi(number) : 0;
}();
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
        is_chosen = f"qelMutant == {numbers[site.name]}"
        if site.may_be_constant:
            is_chosen = f"!std::is_constant_evaluated() && {is_chosen}"
        text += source[start:site.start]
        text += f"(({is_chosen}) ? ({site.after}) : {site.kept.replace('{}', kept)})".encode()
        start = site.end
    return text + source[start:end]


def with_faults(source, sites, numbers):
    """The bytes of a source with the sites' faults in it, line for line; `numbers` says which value chooses a site."""
    return _rendered(source, 0, len(source), _nested(sites), numbers)
