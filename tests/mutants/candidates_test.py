"""What the mutants of a source are, how they are drawn, and what the list of equivalents says."""

import collections
import textwrap

import candidates
import changes
import equivalents
import lines_seen
import selection

SOURCE = """\
#include <cstring>
static_assert(sizeof(int) == 4, "not a mutant");
#define SAY(text)      \\
  do {                 \\
    if (1 == 1) Say(text); \\
  } while (0)
constexpr int kMost = 10;  // 1 + 1
void Say(const char* text);
namespace {
class Counter {
 public:
  int Add(int value, int times);
};
}  // namespace
int Counter::Add(int value, int times) {
  if (value < kMost && times != 0) SAY("few\\n");
  for (int i = 0; i < times; ++i) {
    if (i == value) break;
  }
  memcpy(&value, &times, sizeof(value));
  return !value ? 'a' : 0x1f;
}
"""

# Line: what comes of it.
EXPECTED = {
    7: ["constexpr int kMost = 9;", "constexpr int kMost = 11;", "constexpr int kMost = 0;"],
    16: [
        'if (value <= kMost && times != 0) SAY("few\\n");',
        'if (value >= kMost && times != 0) SAY("few\\n");',
        'if (value < kMost || times != 0) SAY("few\\n");',
        'if (value < kMost && times == 0) SAY("few\\n");',
        'if (value < kMost && times != 1) SAY("few\\n");',
        'if (value < kMost && times != -1) SAY("few\\n");',
        'if (true) SAY("few\\n");',
        'if (false) SAY("few\\n");',
        'if (!(value < kMost && times != 0)) SAY("few\\n");',
        'if (value < kMost && times != 0) SAY("");',
        'if (value < kMost && times != 0) SAY("xew\\n");',
        "if (value < kMost && times != 0) ;",
    ],
    17: [
        "for (int i = 1; i < times; ++i) {",
        "for (int i = -1; i < times; ++i) {",
        "for (int i = 0; i <= times; ++i) {",
        "for (int i = 0; i >= times; ++i) {",
        "for (int i = 0; true; ++i) {",
        "for (int i = 0; false; ++i) {",
        "for (int i = 0; i < times; --i) {",
    ],
    18: [
        "if (i != value) break;",
        "if (true) break;",
        "if (false) break;",
        "if (i == value) ;",
    ],
    20: [";", "memcpy(&times, &value, sizeof(value));"],
    21: [
        "return value ? 'a' : 0x1f;",
        "return true ? 'a' : 0x1f;",
        "return false ? 'a' : 0x1f;",
        "return !value ? 'x' : 0x1f;",
        "return !value ? 'a' : 0x20;",
        "return !value ? 'a' : 0x1e;",
        "return !value ? 'a' : 0;",
    ],
}


def found_in(folder, text):
    source = folder / "source.cpp"
    source.write_text(text)
    found = candidates.of_source(str(source), ["-std=c++17"], str(folder), str(folder))
    return candidates.numbered(set(found))


def test_the_mutants_of_a_source_come_from_its_syntax(tmp_path):
    by_line = collections.defaultdict(list)
    for candidate in found_in(tmp_path, SOURCE):
        by_line[candidate.line].append(candidate.after.split("  //")[0])
    assert {n: sorted(of) for n, of in by_line.items()} == {
        n: sorted(of) for n, of in EXPECTED.items()
    }


def test_a_mutant_is_its_change_and_names_its_function(tmp_path):
    found = found_in(tmp_path, SOURCE)
    changed = next(c for c in found if c.after == "if (i != value) break;")
    assert changed.function == "Counter::Add"
    assert changed.lines == (15, 22)
    expected = SOURCE.replace("i == value", "i != value").encode()
    assert changed.applied_to(SOURCE.encode()) == expected


def test_a_removed_statement_keeps_its_lines():
    assert changes.removed("Call(1,\n     2)") == "\n"


def test_equal_changes_of_equal_lines_are_told_apart(tmp_path):
    text = "void g();\nvoid f() {\n  g();\n  g();\n}\n"
    names = [candidate.name() for candidate in found_in(tmp_path, text)]
    assert [name[4] for name in names] == [0, 1]
    assert names[0][:4] == names[1][:4] == ("source.cpp", "f", "g();", ";")


def many(path, count):
    make = candidates.Candidate
    return [make(path, n, n + 1, "", "f", n, (0, 9), str(n), "") for n in range(count)]


def test_a_seed_draws_the_same_mutants_and_from_each_file_its_part():
    all_of_them = many("a", 300) + many("b", 100)
    drawn = selection.ordered(all_of_them, 1)
    assert drawn == selection.ordered(all_of_them, 1)
    assert drawn[:40] != selection.ordered(all_of_them, 2)[:40]
    assert set(drawn) == set(all_of_them)
    assert abs(sum(c.path == "b" for c in drawn[:40]) - 10) <= 1


def test_the_list_of_equivalent_mutants_tells_reasons_and_its_own_errors(tmp_path):
    text = """\
    # A comment.

    file: source.cpp
    function: f
    - g();
    + ;
    because: one reason
      in two lines

    file: source.cpp
    function: f
    - h();
    + ;
    because: it is not there
    """
    listed = equivalents.Equivalents(textwrap.dedent(text))
    found = found_in(tmp_path, "void g();\nvoid f() {\n  g();\n}\n")
    assert listed.reason(found[0]) == "one reason in two lines"
    assert listed.astray(found) == ["source.cpp\nf\nh();\n;"]


def test_a_line_is_seen_by_its_groups_or_by_those_of_its_function():
    groups = [{"filter": name, "passed": name != "bad"} for name in ("one", "two", "bad")]
    seen = lines_seen.LinesSeen(groups, {"source.cpp": {"3": 1, "4": 0, "9": 0, "5": 6}})

    def names(line, function):
        at = candidates.Candidate("source.cpp", 0, 1, "", "f", line, function, "", "")
        return [group["filter"] for group in seen.of(at)]

    assert names(3, (3, 5)) == ["one"]
    assert names(4, (3, 4)) == ["one"]  # a process that ends by _exit has counted nothing
    assert names(5, (5, 5)) == ["two"]  # the other group fails by itself
    assert names(9, (9, 9)) == []
    assert names(1, (1, 1)) == ["one", "two"]  # a constant has no code


def test_a_line_of_a_header_is_seen_by_the_tests_of_its_folder_too():
    programs = [lines_seen.program_of(folder) for folder in ("platform", "log")]
    groups = [{"filter": program, "program": program, "passed": True} for program in programs]
    seen = lines_seen.LinesSeen(groups, {"tarnwick/platform/lock.h": {"3": 2}})
    at = candidates.Candidate("tarnwick/platform/lock.h", 0, 1, "", "f", 3, (3, 3), "", "")
    assert [group["filter"] for group in seen.of(at)] == programs


def test_groups_are_cases_or_suites():
    listed = "Suite.\n  One\n  Two\nTable/Suite.\n  Row/0  # GetParam() = 1\n  DISABLED_Row\n"
    assert lines_seen.filters_of(listed, True) == ["Suite.One", "Suite.Two", "Table/Suite.Row/0"]
    assert lines_seen.filters_of(listed, False) == ["Suite.*", "Table/Suite.*"]
