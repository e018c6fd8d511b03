"""The examples of the documentation, run as they stand."""

import doctest
import shutil

from conftest import SOURCE


def test_examples(host, monkeypatch):
    host.rename(host.with_name("r"))
    shutil.copytree(SOURCE / "examples/broken", host.with_name("r") / "broken")
    monkeypatch.chdir(host.parent)
    failed, tried = doctest.testfile(str(SOURCE / "docs/python.md"), module_relative=False,
                                     parser=WithoutFences())
    assert (failed, tried > 20) == (0, True)


class WithoutFences(doctest.DocTestParser):
    """The fences of code are no output."""

    def parse(self, string, name="<string>"):
        return super().parse(string.replace("```", "\n"), name)
