"""A library of one function, whose mutants are built and judged."""

import shutil
import subprocess

import candidates
import count_lines
import pytest
import running
import trial
from conftest import ROOT

SOURCE = """\
#include "clamp.h"
int Clamp(int value, int most) {
  while (value > most) {
    --value;
  }
  return value;
}
int Unseen() { return 7; }
"""

TEST = """\
#include <gtest/gtest.h>
#include "clamp.h"
TEST(Clamp, LeavesWhatIsLess) { EXPECT_EQ(Clamp(1, 5), 1); }
TEST(Clamp, CutsWhatIsMore) { EXPECT_EQ(Clamp(9, 5), 5); }
"""

BUILD = """\
cmake_minimum_required(VERSION 3.22)
project(Clamp LANGUAGES CXX)
find_package(GTest REQUIRED)
add_executable(clamp_test clamp.cpp clamp_test.cpp)
target_link_libraries(clamp_test PRIVATE GTest::gtest_main)
"""

PRESETS = """\
{"version": 3, "configurePresets": [{
  "name": "mutants", "generator": "Ninja", "binaryDir": "${sourceDir}/build/mutants"}]}
"""

GROUPS = [{"program": "clamp_test", "filter": "Clamp.*", "seconds": 0.1, "passed": True}]


@pytest.fixture(scope="module", name="project")
def _project(tmp_path_factory):
    folder = tmp_path_factory.mktemp("project")
    texts = {"clamp.cpp": SOURCE, "clamp_test.cpp": TEST, "CMakeLists.txt": BUILD}
    texts |= {"CMakePresets.json": PRESETS, "clamp.h": "int Clamp(int value, int most);\n"}
    for name, text in texts.items():
        (folder / name).write_text(text)
    (folder / "scripts").mkdir()
    for script in ("sandbox", "copy-sources"):
        shutil.copy(ROOT / "scripts" / script, folder / "scripts")
    copy = trial.Copy(str(folder))
    copy.configure()
    copy.must_build(["clamp_test"])
    return copy


@pytest.fixture(name="verdict")
def _verdict(project):
    """verdict(CHANGED LINE): the record of that mutant."""
    source = project.folder + "/clamp.cpp"
    found = candidates.of_source(source, ["-std=c++17"], project.folder, project.folder)

    def judge(after):
        candidate = next(c for c in found if c.after == after)
        return trial.judge(project, candidate, GROUPS)

    return judge


def test_the_tests_pass_without_a_change(project):
    assert trial.failure_of(project, "clamp_test", GROUPS, []) is None


def test_a_mutant_that_a_test_sees_is_killed_by_it(verdict):
    record = verdict("while (value >= most) {")
    assert (record["verdict"], record["by"], record["how"]) == (
        "killed",
        "Clamp.CutsWhatIsMore",
        "failed",
    )


def test_a_mutant_that_no_test_sees_survives_and_the_source_is_as_before(verdict, project):
    record = verdict("int Unseen() { return 8; }")
    assert record["verdict"] == "survived"
    with open(project.folder + "/clamp.cpp", encoding="utf-8") as file:
        assert file.read() == SOURCE


def test_a_mutant_that_never_ends_is_killed_by_the_time(verdict, monkeypatch):
    monkeypatch.setattr(trial, "PROCESSOR_LIMIT", (1, 0))
    record = verdict("while (true) {")
    assert (record["verdict"], record["by"], record["how"]) == (
        "killed",
        "Clamp.LeavesWhatIsLess",
        "time",
    )


def test_a_mutant_that_is_no_program_is_not_built(project):
    broken = candidates.Candidate("clamp.cpp", 0, 1, "x", "f", 1, (1, 1), "", "")
    assert trial.judge(project, broken, GROUPS)["verdict"] == "build"


PASSES = running.Outcome(0, True, "[ RUN      ] Clamp.One\n[       OK ] Clamp.One (0 ms)\n", 0)
FAILS = running.Outcome(1, True, "[ RUN      ] Clamp.One\n[  FAILED  ] Clamp.One (0 ms)\n", 0)
CONTROL = object()


@pytest.mark.parametrize(
    ("outcomes", "killed", "doubts"),
    [
        ([PASSES], False, 0),
        ([FAILS, FAILS, (CONTROL, PASSES)], True, 0),
        ([FAILS, FAILS, (CONTROL, FAILS), PASSES], False, 1),
        ([FAILS, PASSES, PASSES], False, 1),
        ([FAILS, PASSES] * 3 + [FAILS, (CONTROL, PASSES)], True, 3),
        ([FAILS, PASSES] * 3 + [FAILS, (CONTROL, FAILS)], False, 3),
    ],
)
def test_a_test_kills_when_it_fails_again_and_passes_without_the_change(
    outcomes, killed, doubts, monkeypatch
):
    mutated = trial.Copy("", control=CONTROL)
    script = [o if isinstance(o, tuple) else (mutated, o) for o in outcomes]

    def play(copy, _program, _wanted, _seconds):
        expected, outcome = script.pop(0)
        assert copy is expected
        return outcome

    monkeypatch.setattr(trial, "_run_tests", play)
    noted = []
    failure = trial.failure_of(mutated, "clamp_test", GROUPS, noted)
    assert failure == ({"by": "Clamp.One", "how": "failed"} if killed else None)
    assert len(noted) == doubts
    assert not script


def test_what_an_interrupted_run_built_is_built_anew(project, tmp_path, monkeypatch):
    monkeypatch.setattr(trial, "PROCESSOR_LIMIT", (1, 0))
    copy = trial.Copy(str(tmp_path / "copy"))
    copy.prepare(project.folder)
    at = SOURCE.index("--value")
    copy.change(candidates.Candidate("clamp.cpp", at, at + 2, "++", "f", 4, (2, 7), "", ""))
    copy.must_build(["clamp_test"])
    copy.prepare(project.folder)
    copy.must_build(["clamp_test"])
    assert trial.failure_of(copy, "clamp_test", GROUPS, []) is None


def test_executed_lines_are_counted(tmp_path):
    library = tmp_path / "tarnwick"
    library.mkdir()
    (library / "one.cpp").write_text("int main(int n, char**) {\n  if (n > 5)\n    n = 2;\n}\n")
    options = ["-O0", "--coverage", "-fprofile-abs-path"]
    program = str(tmp_path / "one")
    subprocess.run(["g++", *options, "-o", program, "tarnwick/one.cpp"], cwd=tmp_path, check=True)
    group = {"program": "one", "filter": "*"}
    scratch = tmp_path / "scratch"
    scratch.mkdir()
    counted = count_lines.count(str(tmp_path), str(tmp_path), str(scratch), group)
    assert counted["passed"]
    assert counted["lines"] == {"tarnwick/one.cpp": {1: 1, 2: 1, 3: 0, 4: 1}}
