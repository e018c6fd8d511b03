#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_policy
short_description: Install a security policy, all of it or nothing
version_added: 1.0.0
description:
  - Makes a policy the one that the host has, in its files and installed.
  - What would change is asked first, by C(secpolicy load --plan). A policy with errors is refused then, and so is nothing changed.
  - Nothing is done where nothing would change.
  - A load that fails on the way leaves rules, objects, labels of files, and the files of the policy as they were.
options:
  src:
    description:
      - Directory on the host that holds the whole policy.
      - The files of one that lies elsewhere than by default take the place of those in C(/etc/zorvan/secpolicy), which are kept
        as C(/etc/zorvan/secpolicy.previous). Of tardisks, which bring their own policy, what is not in I(src) stays.
      - Of the default directory, which something else has written, the policy is installed.
    type: path
    default: /etc/zorvan/secpolicy
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells what would change, and changes nothing.
    support: full
  diff_mode:
    description: Shows domains, objects, rules, labels of files, and files of the policy; of each side the first 1000 lines.
    support: full
notes:
  - The early policy, below C(early), is loaded by the next boot.
  - Of a directory elsewhere the plan shows objects, domains and labels of files. That partner domains, early or tardisk policy
    change is told by the names of their files alone.
seealso:
  - module: secpolicy.secpolicy.secpolicy_level
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Install the policy that was brought to /var/cache/policy
  secpolicy.secpolicy.secpolicy_policy:
    src: /var/cache/policy
  notify: Restart what the policy confines

- name: Install what is in /etc/zorvan/secpolicy
  secpolicy.secpolicy.secpolicy_policy:

- name: Go back to the policy before
  secpolicy.secpolicy.secpolicy_policy:
    src: /etc/zorvan/secpolicy.previous

- name: Show what would change
  secpolicy.secpolicy.secpolicy_policy:
    src: /var/cache/policy
  check_mode: true
  diff: true
'''

RETURN = r'''
changes:
  description: What was changed, or would be.
  returned: success
  type: dict
  contains:
    domains_created:
      description: Names of the domains that are new.
      type: list
      elements: str
    domains_removed:
      description: Names of the domains that no file defines any more.
      type: list
      elements: str
    objects_added:
      description: How many object labels are new.
      type: int
    objects_removed:
      description: How many object labels are gone.
      type: int
    rules_added:
      description: How many rules are new.
      type: int
    rules_changed:
      description: How many rules say something else.
      type: int
    rules_removed:
      description: How many rules are gone.
      type: int
    files_labelled:
      description: How many files have another label.
      type: int
    policy_files:
      description: How many files of the policy are new, changed or gone.
      type: int
  sample:
    domains_created: [webDom]
    domains_removed: []
    objects_added: 1
    objects_removed: 0
    rules_added: 12
    rules_changed: 0
    rules_removed: 0
    files_labelled: 3
    policy_files: 2
problems:
  description: What is wrong with the policy, or with the load, in the words of the command; the first hundred.
  returned: failure
  type: list
  elements: str
  sample:
    - "Error in parsing policy for domain: webDom: 3 : unknown system call 'opne'"
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import counts_of, diff_of, sides
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.policy_tree import HOST_POLICY, PolicyTree

SHOWN_PROBLEMS = 100


def install(module, command):
    tree = PolicyTree(command.root, module.params['src'])
    before, after = tree.changes()
    replaces = bool(before or after) or tree.is_torn()
    # Of files that are the host's already the plan knows all parts of the policy.
    plan = plan_of(module, command, module.params['src'] if replaces else HOST_POLICY)
    result = dict(changed=replaces or not plan['changesNothing'] or not loaded_well(command),
                  changes=dict(counts_of(plan), policy_files=len(set(before) | set(after))))
    if module._diff:
        result['diff'] = [file_diff(before, after), diff_of(plan)]
    if result['changed'] and not module.check_mode:
        with tree.taking_over():
            command.run('load', '--all-or-nothing')
    return result


def plan_of(module, command, directory):
    """The plan of the load, which a policy with errors does not come to."""
    plan = command.ask('secpolicy.plan/1', 'load', '--plan', directory)
    if plan['ending'] != 'done':
        module.fail_json(msg='the policy in {0} has errors, and nothing was changed'.format(module.params['src']),
                         problems=plan['errors'][:SHOWN_PROBLEMS])
    return plan


def loaded_well(command):
    """Whether the latest load did what it was to do; if not, monitoring tells of it until there is another."""
    latest = command.ask('secpolicy.status/1', 'status')['latestLoad']
    return latest is not None and latest['ending'] == 'done'


def file_diff(before, after):
    def lines(files):
        return ['{0} {1}'.format(digest[:16], path) for path, digest in sorted(files.items())]
    return sides('files of the policy', lines(before), 'files of the new policy', lines(after))


def main():
    module = AnsibleModule(argument_spec=dict(src=dict(type='path', default=HOST_POLICY), **ROOT_ARGUMENT),
                           supports_check_mode=True)
    run_module(module, install)


if __name__ == '__main__':
    main()
