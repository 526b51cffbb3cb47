"""The mutation test finds a gap: a program whose test misses one boundary and one text."""

import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

HERE = pathlib.Path(__file__).resolve().parent
TOOL = HERE.parent.parent / "tools/mutate"
sys.path.insert(0, str(TOOL))
import sources  # noqa: E402

SOURCE = """
#include <string>
#include <vector>
namespace {
constexpr int kStep = 2;
constexpr int kSize = 3;
struct Log { std::vector<std::string> lines; void add(const char* text) { lines.emplace_back(text); } };
constexpr bool isSmall(int number) { return number < 10; }
std::string describe(Log& log, int number) {
    int places[kSize] = {};
    log.add("begin");
    log.add("end");
    if (number < 0) {
        log.add("negative");
        return "below";
    }
    places[0] = number + kStep;
    return isSmall(places[0]) && number != 5 ? "small" : "large";
}
}  // namespace
int main() {
    Log log;
    const bool passes = describe(log, -1) == "below" && log.lines.size() == 3 && log.lines[2] == "negative" &&
                        describe(log, 7) == "small" && describe(log, 5) == "large" &&
                        describe(log, 8) == "large" && log.lines.back() == "end";
    return passes ? 0 : 1;
}
"""

# What that test cannot tell from the program.
GAPS = {
    "comparison: number < 0 -> <= | if (number < 0) {",
    "constant: 0 -> 0 + 1 | if (number < 0) {",
    'constant: "begin" -> ~ | log.add("begin");',
}
OPERATORS = {"branch removed", "comparison", "condition negated", "constant", "operand removed", "operator",
             "statement dropped", "statements swapped"}


class MutateTest(unittest.TestCase):
    def test_names_what_a_test_misses(self):
        with tempfile.TemporaryDirectory() as folder:
            root = pathlib.Path(folder) / "root"
            root.mkdir()
            (root / "sample.cpp").write_text(SOURCE)
            files, unread, _ = sources.find(root, ["sample.cpp"], {"sample.cpp": ["-xc++", "-std=c++20"]})
            self.assertEqual(unread, set())
            file = files["sample.cpp"]
            file.drop(next(s for s in file.sites if s.name == "kSize"), "needed by the compiler")
            file.sites = [s for s in file.sites if s.end < SOURCE.index("int main")]
            mutated = pathlib.Path(folder) / "mutated"
            file.write(mutated)
            self.assertEqual((mutated / "sample.cpp").read_text().count("\n"), SOURCE.count("\n"))
            program = pathlib.Path(folder) / "program"
            subprocess.run(["g++", "-std=c++20", "-w", "-include", TOOL / "mutants.h", "-o", program,
                            mutated / "sample.cpp"], check=True)

            def passes(number):
                return subprocess.run([program], stderr=subprocess.DEVNULL, timeout=60,
                                      env=dict(os.environ, ZR_MUTANT=str(number))).returncode == 0

            self.assertTrue(passes(0))
            choices = {m.number: m for site in file.sites for m, _ in site.choices}
            self.assertEqual({m.what for m in choices.values()}, OPERATORS)
            survivors = {f"{m.what}: {m.change} | {m.text}" for m in choices.values() if passes(m.number)}
            self.assertEqual(survivors, GAPS)
            self.assertEqual({m.excluded for m in file.mutants}, {"", "needed by the compiler"})


if __name__ == "__main__":
    unittest.main()
