"""Fixtures of the twhttp tests."""

import pytest

from twhttp_server import Peer, make_identity


@pytest.fixture
def peer():
    """peer(scripts...): a server that ends with the test."""
    peers = []

    def start(*scripts, tls=None):
        peers.append(Peer(*scripts, tls=tls))
        return peers[-1]

    yield start
    for each in peers:
        each.close()


@pytest.fixture(scope="session")
def identity(tmp_path_factory):
    """A TLS context of a server, and the file of its certificate."""
    return make_identity(tmp_path_factory.mktemp("identity"))
