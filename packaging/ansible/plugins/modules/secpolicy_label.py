#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_label
short_description: Give files a label, or the one that the policy says
version_added: 1.0.0
description:
  - With I(label), gives the files this label, until a load gives those that the policy names theirs.
  - Without, gives every file that the policy names the label that it says, as C(secpolicy label relabel) does.
options:
  label:
    description: An object label of the installed policy.
    type: str
  path:
    description:
      - The files.
      - Without I(label), only what is at or below one of them; by default all that the policy names.
    type: list
    elements: path
    default: []
  recurse:
    description: With I(label), everything below the directories too.
    type: bool
    default: false
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells which files would get another label, and gives none.
    support: full
  diff_mode:
    description: Shows the labels that differ, the first 1000.
    support: full
notes:
  - A label that a file has from a directory above is not its own yet, and setting it is a change.
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Label a key that this play has made
  secpolicy.secpolicy.secpolicy_label:
    label: sshKey
    path: /etc/ssh/new_key

- name: Give all files the labels that the policy says
  secpolicy.secpolicy.secpolicy_label:

- name: Give those below /var what the policy says
  secpolicy.secpolicy.secpolicy_label:
    path: /var
'''

RETURN = r'''
files:
  description: How many files got another label, or would get one.
  returned: success
  type: int
  sample: 1
problems:
  description: What went wrong, in the words of the command.
  returned: failure
  type: list
  elements: str
  sample:
    - "Error: /etc/ssh/new_key: No such file or directory"
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides


def label(module, command):
    changes = changes_to_label(module, command) if module.params['label'] else changes_to_policy(module, command)
    result = dict(changed=bool(changes), files=len(changes))
    if module._diff:
        result['diff'] = sides('labels', ['{0}: {1}'.format(path, before) for path, before, _after in changes],
                               'new labels', ['{0}: {1}'.format(path, after) for path, _before, after in changes])
    if changes and not module.check_mode:
        give_labels(module, command)
    return result


def changes_to_label(module, command):
    wanted, paths = module.params['label'], module.params['path']
    found = command.ask('secpolicy.labels/1', 'label', 'get', *recursion(module), operands=paths)['files']
    changes = [(file['path'], told(file), wanted) for file in found if file['label'] != wanted or file['inherited']]
    # Those that have none, or are not there, are not among the labels that there are.
    known = {file['path'] for file in found}
    return changes + [(path, 'none', wanted) for path in paths if path not in known]


def changes_to_policy(module, command):
    plan = command.ask('secpolicy.label-relabel/1', 'label', 'relabel', '--dry-run', operands=module.params['path'])
    return [(change['path'], told(dict(change, label=change['before'])), change['after']) for change in plan['changes']]


def told(file):
    return file['label'] + (' (inherited)' if file['inherited'] else '')


def give_labels(module, command):
    if module.params['label']:
        command.run('label', 'set', *recursion(module), operands=[module.params['label']] + module.params['path'])
    else:
        command.run('label', 'relabel', operands=module.params['path'])


def recursion(module):
    return ['-R'] if module.params['recurse'] else []


def main():
    module = AnsibleModule(
        argument_spec=dict(label=dict(type='str'), path=dict(type='list', elements='path', default=[]),
                           recurse=dict(type='bool', default=False), **ROOT_ARGUMENT),
        supports_check_mode=True)
    if module.params['label'] and not module.params['path']:
        module.fail_json(msg='path is missing: a label is given to files')
    run_module(module, label)


if __name__ == '__main__':
    main()
