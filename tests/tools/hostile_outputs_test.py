"""Whatever stands where twhttp and twcamsim write and read the files that a caller names."""

import pathlib

import pytest

from planted import KINDS, NO_FILES, plant
from twhttp_fixtures import peer
from twhttp_server import response

pytestmark = pytest.mark.native

SOON = 30

# Where everybody may make files.
SHARED_MEMORY = pathlib.Path("/dev/shm")


@pytest.fixture
def soon(run):
    return lambda *args: run(*args, timeout=SOON)


# Recordings


RECORDED = ("001.request", "001.response", "exchanges.jsonl")


@pytest.mark.parametrize("kind", sorted(set(KINDS) - {"directory"}))
@pytest.mark.parametrize("name", RECORDED)
def test_a_recording_takes_the_place_of_what_was_planted(soon, peer, plant, tmp_path, name, kind):
    directory = tmp_path / "a"
    directory.mkdir()
    planted = plant(kind, directory / name)
    assert soon("twhttp", "get", "--record", directory, peer(response(b"x")).url()).returncode == 0
    assert (directory / name).is_file() and not (directory / name).is_symlink()
    assert (directory / name).stat().st_size < 4096
    assert planted.untouched()


@pytest.mark.parametrize("name", RECORDED)
def test_a_directory_of_a_recordings_name_is_told(soon, peer, plant, tmp_path, name):
    plant("directory", tmp_path / name)
    done = soon("twhttp", "get", "--record", tmp_path, peer(response(b"x")).url())
    assert done.returncode == 3
    assert f"twhttp: {tmp_path}/{name}: File exists\n" in done.stderr


@pytest.mark.parametrize("kind", sorted(set(KINDS) - {"directory"}))
def test_a_directory_for_recordings_that_is_none_is_told(soon, peer, plant, tmp_path, kind):
    planted = plant(kind, tmp_path / "a")
    done = soon("twhttp", "get", "--record", tmp_path / "a", peer(response(b"x")).url())
    told = "it is a link" if "link" in kind and kind != "hard link" else "Not a directory"
    assert done.returncode == 3
    assert f"twhttp: {tmp_path}/a: {told}\n" in done.stderr
    assert planted.untouched()


@pytest.mark.parametrize("kind", sorted(set(NO_FILES) - {"directory"}) + ["three MiB"])
def test_a_directory_that_is_none_is_not_played_back(soon, plant, tmp_path, kind):
    plant(kind, tmp_path / "a")
    done = soon("twcamsim", "--for", "10ms", "--replay", tmp_path / "a")
    assert (done.returncode, done.stdout) == (2, "")
    assert done.stderr.count("\n") == 1 and f"{tmp_path}/a" in done.stderr


# Files that the simulated camera writes


def camera_words(option, path):
    if option == "posted":
        return ["twcamsim", "--for", "10ms", "-e", f"site,posted={path}"]
    return ["twcamsim", "--for", "10ms", "-e", "json", option, path]


LINKS = ["dangling link", "link in a circle", "link of another user", "link to a device"]


@pytest.mark.parametrize("directory", [None, SHARED_MEMORY])
@pytest.mark.parametrize("option", ["--journal", "--access", "posted"])
@pytest.mark.parametrize("kind", LINKS)
def test_a_link_is_not_written_through(soon, plant, tmp_path, option, kind, directory):
    path = (directory or tmp_path) / "written"
    try:
        planted = plant(kind, path)
        done = soon(*camera_words(option, path))
        assert done.returncode in (1, 2) and done.stdout == ""
        assert f"{path}: it is a link" in done.stderr
        assert planted.untouched()
    finally:
        path.unlink()
        (path.parent / "target").unlink()


@pytest.mark.parametrize("option", ["--journal", "--access", "posted"])
def test_no_link_is_reached_around_a_directory_of_the_system(soon, plant, tmp_path, option):
    tmp_path.chmod(0o1777)
    planted = plant("link of another user", tmp_path / "written")
    done = soon(*camera_words(option, f"/dev/..{tmp_path}/written"))
    assert done.returncode in (1, 2)
    assert "it is a link" in done.stderr
    assert planted.untouched()


@pytest.mark.parametrize("option", ["--journal", "--access", "posted"])
@pytest.mark.parametrize("kind", ["directory", "socket"])
def test_what_cannot_be_written_is_told(soon, plant, tmp_path, option, kind):
    plant(kind, tmp_path / "written")
    done = soon(*camera_words(option, tmp_path / "written"))
    assert done.returncode in (1, 2) and done.stdout == ""
    assert f"{tmp_path}/written: {NO_FILES[kind]}" in done.stderr


@pytest.mark.parametrize("kind", LINKS)
def test_the_authoritys_certificate_is_not_written_through_a_link(soon, plant, tmp_path, kind):
    planted = plant(kind, tmp_path / "ca.pem")
    done = soon("twcamsim", "--for", "10ms", "-e", "json,tls", "--dir", tmp_path)
    assert (done.returncode, done.stdout) == (1, "")
    assert f"{tmp_path}/ca.pem: it is a link" in done.stderr
    assert planted.untouched()


# Files that twhttp reads


@pytest.mark.parametrize("kind", ["directory", "socket", "dangling link", "link in a circle"])
@pytest.mark.parametrize("words", [["form", "-f"], ["upload", "-f"], ["get", "--password-file"]])
def test_a_file_that_cannot_be_read_is_told(soon, peer, plant, tmp_path, words, kind):
    plant(kind, tmp_path / "read")
    server = peer(response(b"x"))
    done = soon("twhttp", *words, tmp_path / "read", server.url(login="user"))
    assert done.returncode in (2, 3)
    assert f"{tmp_path}/read" in done.stderr
    assert server.requests == []
