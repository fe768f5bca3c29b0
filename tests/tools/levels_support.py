"""What the tests of the levels and of the settings file share."""

import subprocess

import pytest

from conftest import LOG_DIRECTORY, SETTINGS_DIRECTORY

ACCOUNT, HTTP, SOCKET, UTILS = 0, 26, 57, 66
ALARM, ERROR, WARN, NOTICE, INFO, DEBUG, DEBUG2, DEBUG3 = range(8)
SETTINGS = SETTINGS_DIRECTORY / "settings.conf"
LOG = LOG_DIRECTORY / "tarnwick.log"


@pytest.fixture
def as_nobody(command):
    """as_nobody(*args): twlogctl's CompletedProcess as a user who owns nothing."""
    prefix = ["setpriv", "--reuid=65534", "--regid=65534", "--clear-groups"]

    def run_as_nobody(*args):
        words = [*prefix, *command("twlogctl", *args)]
        return subprocess.run(words, capture_output=True, text=True, timeout=120, check=False)

    if run_as_nobody("--help").returncode != 0:
        pytest.skip("there is no other user here, or the tool is out of that user's reach")
    return run_as_nobody


def saved(levels, flag="no"):
    listed = ",".join(map(str, levels))
    return f'tw_dbglog_settings="{listed}"\ntw_dbglog_time_scale="{flag}"\n'
