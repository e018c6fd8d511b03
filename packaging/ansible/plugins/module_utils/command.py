# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

"""The command secpolicy as modules use it: started without a shell, and read where it writes JSON."""

import json

ROOT_ARGUMENT = dict(root=dict(type='path', default='/'))


class CommandFailed(Exception):
    """What the command said, and what it had been asked."""

    def __init__(self, words, status, errors):
        super().__init__("'secpolicy {0}' ended with {1}: {2}".format(' '.join(words), status, reason(errors)))
        self.problems = [line for line in errors.splitlines() if line]
        # What the module tells beside, of what was done before.
        self.result = {}


class Command:
    """The command below one root directory of the host."""

    def __init__(self, module):
        self.module = module
        self.root = module.params['root']
        self.start = [module.get_bin_path('secpolicy', required=True)]
        if self.root != '/':
            self.start += ['--root', self.root]

    def run(self, *words, operands=()):
        """Fails unless all was well. No operand is taken for an option."""
        words += after_options(operands)
        status, output, errors = self.module.run_command(self.start + list(words))
        if status != 0:
            raise CommandFailed(words, status, errors)
        return output

    def ask(self, schema, *words, operands=()):
        """The document that the command answers with, also where its exit status is a part of the answer."""
        words += ('--format', 'json') + after_options(operands)
        status, output, errors = self.module.run_command(self.start + list(words))
        try:
            document = json.loads(output)
        except ValueError:
            raise CommandFailed(words, status, errors)
        if document.get('schema') != schema:
            raise CommandFailed(words, status, 'the answer is of {0}, and {1} was expected'.format(
                document.get('schema'), schema))
        return document


def after_options(operands):
    return ('--',) + tuple(operands) if operands else ()


def reason(errors):
    """The last line that says what went wrong; a hint at how the command is used may follow it."""
    lines = errors.strip().splitlines() or ['it wrote nothing']
    return ([line for line in lines if line.startswith('secpolicy:')] or lines)[-1]


def run_module(module, work):
    """What `work` returns is the result of the module, and a command that fails is its failure."""
    try:
        module.exit_json(**work(module, Command(module)))
    except CommandFailed as failure:
        module.fail_json(msg=str(failure), problems=failure.problems, **failure.result)
    except OSError as failure:
        module.fail_json(msg=str(failure), problems=[])
