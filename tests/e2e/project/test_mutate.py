"""scripts/mutate finds the places where something can be broken, and builds all of these faults into one program."""

import os
import shutil
import subprocess
import sys
import unittest
from pathlib import Path

from support import ToolTestCase

ROOT = Path(__file__).resolve().parents[3]
sys.path.insert(0, str(ROOT / "scripts" / "mutation"))
try:
    from schemata import MOST_FAULTS, SWITCH, with_faults
    from sites import sites_of
except ImportError:
    sites_of = None

SOURCE = """\
#include <cstdio>
#include <string>
#define LARGE(value) ((value) > 9)
namespace {
constexpr int kLimit = 3;
static_assert(kLimit < 4);
constexpr int doubled(int number) { return number + number; }
constexpr int kDoubled = doubled(2);
bool within(int number) {
  if (number < kLimit &&  // a remark
      number != 1) {
    return true;
  }
  switch (number) { case 7: return LARGE(number); default: return false; }
}
void say(const std::string& text) { std::fputs(text.c_str(), stdout); }
}  // namespace
int main() {
  std::string numbers;
  numbers.reserve(9);
  for (int number = 0; number < 5; number++) {
    if (within(number)) numbers += std::to_string(number);
  }
  say(numbers);
  say(numbers.empty() ? "none" : std::to_string(doubled(kDoubled)) + "!");
}
"""

# The line, the kind, what stood there, and what the program prints with the fault.
FAULTS = (
    (7, "sum", "number + number", "020!"),
    (10, "condition", "number < kLimit && number != 1", "1348!"),
    (10, "connective", "number < kLimit && number != 1", "012348!"),
    (10, "comparison", "number < kLimit", "0238!"),
    (10, "constant", "kLimit", "0238!"),
    (11, "comparison", "number != 1", "18!"),
    (11, "constant", "1", "018!"),
    (12, "truth", "true", "none"),
    (14, "truth", "false", "012348!"),
    (16, "statement", "std :: fputs ( text . c_str ( ) , stdout )", ""),
    (21, "constant", "0", "28!"),
    (21, "comparison", "number < 5", "028!"),
    (21, "condition", "number < 5", "none"),
    (21, "constant", "5", "028!"),
    (22, "condition", "within ( number )", "1348!"),
    (22, "statement", "numbers += std :: to_string ( number )", "none"),
    (24, "statement", "say ( numbers )", "8!"),
    (25, "statement", 'say ( numbers . empty ( ) ? "none" : std :: to_string ( doubled ( kDoubled ) ) + "!" )', "02"),
    (25, "condition", "numbers . empty ( )", "02none"),
    (25, "constant", "kDoubled", "0210!"),
)


@unittest.skipUnless(sites_of, "scripts/setup --mutate installs what this needs")
class MutateTest(ToolTestCase):
    def test_every_fault_can_be_chosen(self):
        self.write("source.cpp", SOURCE)
        sites = sites_of(self.directory, "source.cpp", ["-std=c++20"])
        self.assertEqual([(site.line, site.kind, site.before) for site in sites], [fault[:3] for fault in FAULTS])
        compiler = os.environ.get("CXX") or shutil.which("c++")
        if not compiler:
            self.skipTest("there is no compiler")
        numbers = {site.name: number for number, site in enumerate(sites, start=1)}
        self.write("switch.h", SWITCH)
        faulty = with_faults(SOURCE.encode(), sites, numbers)
        self.assertEqual(faulty.count(b"\n"), SOURCE.count("\n"))
        self.write("faulty.cpp", faulty)
        subprocess.run([compiler, "-std=c++20", "-w", "-include", "switch.h", "faulty.cpp", "-o", "faulty"],
                       cwd=self.directory, check=True)
        for number, expected in enumerate(("028!", *(fault[3] for fault in FAULTS))):
            with self.subTest(number, fault=FAULTS[number - 1][:3] if number else None):
                printed = subprocess.run([self.path("faulty")], env={"QEL_MUTANT": str(number)}, timeout=30,
                                         check=True, capture_output=True, text=True).stdout
                self.assertEqual(printed, expected)

        met = self.write("met", bytes(MOST_FAULTS))
        subprocess.run([self.path("faulty")], env={"QEL_REACHED": str(met)}, timeout=30, check=True,
                       stdout=subprocess.DEVNULL)
        self.assertEqual([number for number, byte in enumerate(met.read_bytes()) if byte], [*numbers.values()])

    def test_operators_in_a_row_are_told_apart(self):
        self.write("source.cpp", "bool f(bool a, bool b, bool c) { return a || b || c; }")
        sites = sites_of(self.directory, "source.cpp", [])
        self.assertEqual([site.after for site in sites], ["(a || b) && (c)", "(a) && (b)"])
        self.assertEqual(len({site.name for site in sites}), 2)

    def test_an_equality_is_not_negated_twice(self):
        self.write("source.cpp", "bool f(int a) { if (a == 1) return !a; return false; }")
        sites = sites_of(self.directory, "source.cpp", [])
        self.assertEqual([site.after for site in sites], ["(a) != (1)", "1 + 1", "true"])

    def test_a_negative_number_comes_nearer_to_zero(self):
        self.write("source.cpp", "int f(int a) { int b = -1; b = a ? -2 : a -3; return (-4) + (a) -5 + a[&b] -6; }")
        sites = sites_of(self.directory, "source.cpp", [])
        self.assertEqual([site.after for site in sites if site.kind == "constant"],
                         ["1 - 1", "2 - 1", "3 + 1", "4 - 1", "5 + 1", "6 + 1"])


if __name__ == "__main__":
    unittest.main()
