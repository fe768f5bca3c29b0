"""scripts/first-steps --check: each block of commands in a document says who runs it."""

import shutil
import subprocess

import pytest

from conftest import HANG, ROOT


@pytest.fixture
def check(tmp_path):
    """check(text): what the script says to a README of this text; empty when it is content."""
    scripts = tmp_path / "scripts"
    scripts.mkdir()
    shutil.copy(ROOT / "scripts/first-steps", scripts)
    (tmp_path / "dev").write_text('check_steps=("test coverage" lint\n  demo)\n')
    (scripts / "other").write_text('cmake -G Ninja "-DPREFIX=$prefix"\n')

    def run(text):
        (tmp_path / "README.md").write_text(text)
        command = [scripts / "first-steps", "--check"]
        done = subprocess.run(command, capture_output=True, text=True, timeout=HANG, check=False)
        assert done.returncode == (1 if done.stderr else 0)
        return done.stderr.removeprefix("first-steps: README.md").strip()

    return run


@pytest.mark.parametrize(
    "text",
    [
        "<!-- run -->\n```sh\ntrue\n```\n",
        "<!-- run -->\n\n    true\n",
        "<!-- not run: ./dev check does it -->\n\n    ./dev demo  # a word\n    ./dev test\n",
        "<!-- not run: scripts/other does it -->\n\n    cmake -G Ninja -DPREFIX=PLACE\n",
        "```text\nwhat a program says\n```\n",
        "```cpp\nint x;\n```\n",
        "A picture:\n\n    a → b\n",
        "- a list\n    that goes on\n",
    ],
)
def test_content(check, text):
    assert check(text) == ""


@pytest.mark.parametrize(
    "text, said",
    [
        ("```sh\ntrue\n```\n", ":1: say above the block"),
        ("```\ntrue\n```\n", ":1: say above the block"),
        ("Now:\n\n    true\n", ":3: say above the block"),
        ("<!-- run -->\n\nNow:\n\n    true\n", ":3: no block of commands follows"),
        ("<!-- run -->\n", ": no block of commands follows"),
        ("<!-- not run: it is long -->\n\n    true\n", ":1: not a mark"),
        ("<!-- runs -->\n\n    true\n", ":1: not a mark"),
        ("<!-- not run: ./dev check does it -->\n\n    ./dev soak\n", ":3: ./dev check does not"),
        ("<!-- not run: ./dev check does it -->\n\n    true\n", ":3: ./dev check does not"),
        ("<!-- not run: scripts/none does it -->\n\n    true\n", ":3: no such file"),
        ("<!-- not run: scripts/other does it -->\n\n    cmake -G Make\n", ":3: scripts/other"),
    ],
)
def test_not_content(check, text, said):
    assert check(text).startswith(said)


def test_the_documents_are_content():
    command = [ROOT / "scripts/first-steps", "--check"]
    subprocess.run(command, timeout=HANG, check=True)
