#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_facts
short_description: Tell which policy a host has, and how it was loaded
version_added: 1.0.0
description:
  - Makes what C(secpolicy status) and C(secpolicy settings list) say facts of the host.
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Nothing is ever changed.
    support: full
  diff_mode:
    description: Nothing is ever changed.
    support: none
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Look at the policy
  secpolicy.secpolicy.secpolicy_facts:

- name: Stop where the latest load went wrong
  ansible.builtin.assert:
    that: ansible_facts.secpolicy.status.latestLoad.ending == 'done'
'''

RETURN = r'''
ansible_facts:
  description: What the host says of itself.
  returned: success
  type: complex
  contains:
    secpolicy:
      description: Of the policy.
      type: dict
      contains:
        status:
          description: The document of C(secpolicy status --format json).
          type: dict
          sample:
            loaded: true
            domains: 9
            rules: 159
        settings:
          description: The document of C(secpolicy settings list --format json).
          type: dict
          sample:
            option: {}
            enforcement:
              webDom: permissive
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, run_module


def facts(_module, command):
    return dict(changed=False, ansible_facts=dict(secpolicy=dict(
        status=command.ask('secpolicy.status/1', 'status'),
        settings=command.ask('secpolicy.settings/1', 'settings', 'list'))))


def main():
    run_module(AnsibleModule(argument_spec=ROOT_ARGUMENT, supports_check_mode=True), facts)


if __name__ == '__main__':
    main()
