"""Builds one copy of the product that holds every fault that compiles, and remembers what was built."""

import hashlib
import json
import os
import re
import shutil
import subprocess
from collections import defaultdict
from concurrent.futures import ProcessPoolExecutor
from dataclasses import asdict
from itertools import chain, repeat
from pathlib import Path

from schemata import SWITCH, with_faults
from sites import Site, sites_of

ROOT = Path(__file__).resolve().parent.parent.parent
WORK = ROOT / "build" / "mutation"
TREE = WORK / "tree"
BUILD = WORK / "build"
NOT_THE_PRODUCT = {"tests", "fuzz", "bench", "packaging", "examples"}
DIAGNOSTIC = re.compile(r"^([^:\s]+):(\d+):(?:\d+:)? +(?:error|note|required|in .constexpr)", re.MULTILINE)


def _output(*command):
    return subprocess.run(command, cwd=ROOT, capture_output=True, check=True, text=True).stdout


def _files():
    listed = _output("git", "ls-files", "-co", "--exclude-standard", "-z").split("\0")
    return sorted(name for name in listed if name and (ROOT / name).is_file())


def _is_product(name):
    return name.endswith((".h", ".cpp")) and name.split("/")[0] not in NOT_THE_PRODUCT


def digest(is_part):
    """Changes with the files whose names are such a part."""
    state = hashlib.sha256()
    for name in filter(is_part, _files()):
        state.update(name.encode() + b"\0" + (ROOT / name).read_bytes())
    return state.hexdigest()[:16]


def product_digest():
    """Changes with the faults that there are."""
    return digest(lambda name: _is_product(name) or name.startswith("scripts/mutation/"))


def _write(path, content):
    """Leaves a file alone that is so already, which then need not be built again."""
    path.parent.mkdir(parents=True, exist_ok=True)
    if not path.is_file() or path.read_bytes() != content:
        path.write_bytes(content)


def _copy(files, sites_by_path, numbers):
    for path in [path for path in TREE.rglob("*") if path.is_file()]:
        if str(path.relative_to(TREE)) not in files:
            path.unlink()
    for name, content in files.items():
        if sites_by_path.get(name):
            content = with_faults(content, sites_by_path[name], numbers)
        _write(TREE / name, content)
        shutil.copymode(ROOT / name, TREE / name)
    _write(WORK / "switch.h", SWITCH.encode())


def _configure():
    # A fault may not even warn, and what was constant may not be so any more.
    subprocess.run(["cmake", "-S", TREE, "-B", BUILD, "-G", "Ninja", "-DCMAKE_BUILD_TYPE=Release",
                    "-DCMAKE_CXX_FLAGS_RELEASE=-O1", "-DQEL_HARDENING=OFF",
                    f"-DCMAKE_CXX_FLAGS=-w -Wno-narrowing -include {WORK / 'switch.h'}"],
                   check=True, stdout=subprocess.DEVNULL)


def _guilty(output, sites_by_path):
    """The sites on the first line with any that each failed compilation complains of: what follows may only be its
    consequence."""
    guilty = []
    for failure in output.split("\nFAILED: ")[1:]:
        for path, line in DIAGNOSTIC.findall(failure):
            name = os.path.relpath(BUILD / path, TREE)
            found = [site for site in sites_by_path.get(name, ()) if site.line == int(line)]
            if found:
                guilty += found
                break
    return guilty


def _build(jobs, sites_by_path, numbers):
    """Builds, without ever more of the sites until it works. The sites that were left out."""
    left_out = []
    files = {name: (ROOT / name).read_bytes() for name in _files()}  # which may be edited from now on
    while True:
        _copy(files, sites_by_path, numbers)
        _configure()
        for target in ("qel_library", "all"):  # the tests only when the product's headers compile
            built = subprocess.run(["cmake", "--build", BUILD, "-j", str(jobs), "--target", target, "--", "-k", "0"],
                                   stdout=subprocess.PIPE, stderr=subprocess.STDOUT, check=False, text=True)
            if built.returncode != 0:
                break
        else:
            return left_out
        guilty = _guilty(built.stdout, sites_by_path)
        if not guilty:
            raise RuntimeError(f"the build fails, and not for a fault:\n{built.stdout[-4000:]}")
        for site in guilty:
            if site in sites_by_path[site.path]:
                sites_by_path[site.path].remove(site)
                left_out.append(site)
        print(f"{len(left_out)} faults do not compile so far", flush=True)


def _all_sites(jobs):
    names = [name for name in _files() if _is_product(name)]
    arguments = ["-std=c++20", f"-I{ROOT}", '-DQEL_VERSION="0"', *_output("pkg-config", "--cflags", "libcurl").split()]
    with ProcessPoolExecutor(jobs) as pool:
        everything = [*chain(*pool.map(sites_of, repeat(ROOT), names, repeat(arguments)))]
    functions = {(site.path, site.function) for site in everything}
    print(f"{len(everything)} faults in {len(functions)} functions", flush=True)
    return dict(enumerate(everything, start=1))


def built_sites(jobs):
    """All faults that the build holds, by the number that chooses one. Builds what has changed."""
    state = WORK / "sites.json"
    product = product_digest()
    known = json.loads(state.read_text()) if state.is_file() else {}
    if known.get("product") == product:
        sites = {int(number): Site(**site) for number, site in known["sites"].items()}
    else:
        sites = _all_sites(jobs)
    sites_by_path = defaultdict(list)
    for site in sites.values():
        sites_by_path[site.path].append(site)
    numbers = {site.name: number for number, site in sites.items()}
    left_out = {site.name for site in _build(jobs, sites_by_path, numbers)}
    sites = {number: site for number, site in sites.items() if site.name not in left_out}
    for site in sites.values():
        site.children = []
    kept = {number: asdict(site) for number, site in sites.items()}
    state.write_text(json.dumps({"product": product, "sites": kept}))
    return sites
