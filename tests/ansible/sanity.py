"""`ansible-test sanity` with the checkers that Debian has, which else downloads others."""
import sys

from ansible_test._internal import main
from ansible_test._internal.commands import sanity

make_environment = sanity.create_virtual_environment


def with_installed_packages(args, python, path):
    return make_environment(args, python, path, system_site_packages=True, pip=False)


sanity.create_virtual_environment = with_installed_packages
sanity.run_pip = lambda *_words: None
sys.exit(main())
