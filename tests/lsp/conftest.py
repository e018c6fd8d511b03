import pathlib
import shutil

import pytest
from client import Client

SOURCE = pathlib.Path(__file__).resolve().parent.parent.parent


@pytest.fixture
def root(tmp_path):
    """A root with the broken example as its policy, and some files for the paths of rules."""
    root = tmp_path / "r\u00f6 ot"
    shutil.copytree(SOURCE / "examples/broken", root / "etc/zorvan/secpolicy")
    for path in ["usr/share/doc", "usr/shadow", "usr/bin"]:
        (root / path).mkdir(parents=True)
    (root / "usr/bin/env").touch()
    return root


@pytest.fixture
def policy(root):
    return root / "etc/zorvan/secpolicy"


@pytest.fixture
def web(policy):
    return policy / "domains/webDom"


@pytest.fixture
def client(root):
    with Client(root, "--fresh") as client:
        client.start(workspace={"workspaceEdit": {"documentChanges": True,
                                                  "resourceOperations": ["create", "rename", "delete"]}})
        yield client
        assert client.stop() == 0
