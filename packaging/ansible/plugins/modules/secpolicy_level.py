#!/usr/bin/python
# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT

DOCUMENTATION = r'''
module: secpolicy_level
short_description: Set the enforcement level of domains
version_added: 1.0.0
description:
  - Stores a level for domains that are installed, and gives it to them. It stays over loads and boots.
  - A domain that is permissive refuses nothing, and tells what it would refuse.
  - Programs that run already keep the level that they were started with.
options:
  domain:
    description: The domains.
    type: list
    elements: str
    required: true
  level:
    description: Their level.
    type: str
    required: true
    choices: [enforcing, permissive, disabled]
extends_documentation_fragment:
  - secpolicy.secpolicy.root
attributes:
  check_mode:
    description: Tells which domains would get another level, and gives none. A domain may be one that is still to be installed.
    support: full
  diff_mode:
    description: Shows the domains that get another level.
    support: full
author:
  - The libsecpolicy authors (@libsecpolicy)
'''

EXAMPLES = r'''
- name: Let a new domain tell what it would refuse
  secpolicy.secpolicy.secpolicy_level:
    domain: webDom
    level: permissive

- name: Refuse it
  secpolicy.secpolicy.secpolicy_level:
    domain: [webDom, mailDom]
    level: enforcing
  notify: Restart what the policy confines
'''

RETURN = r'''
domains:
  description: The domains that got another level, or would get one.
  returned: success
  type: list
  elements: str
  sample: [webDom]
problems:
  description: What went wrong, in the words of the command.
  returned: failure
  type: list
  elements: str
  sample: []
'''

from ansible.module_utils.basic import AnsibleModule
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.command import ROOT_ARGUMENT, run_module
from ansible_collections.secpolicy.secpolicy.plugins.module_utils.plan import sides


def set_levels(module, command):
    wanted = module.params['level']
    levels = installed_levels(command)
    stored = command.ask('secpolicy.settings/1', 'settings', 'list')['enforcement']
    unknown = [domain for domain in module.params['domain'] if domain not in levels]
    if unknown and not module.check_mode:
        module.fail_json(msg='not installed, so nothing was changed: ' + ', '.join(unknown), problems=[])
    changed = [domain for domain in module.params['domain'] if {levels.get(domain), stored.get(domain)} != {wanted}]
    result = dict(changed=bool(changed), domains=changed)
    if module._diff:
        result['diff'] = sides('levels', ['{0}: {1}'.format(domain, levels.get(domain, 'not installed')) for domain in changed],
                               'new levels', ['{0}: {1}'.format(domain, wanted) for domain in changed])
    if changed and not module.check_mode:
        for domain in changed:
            command.run('settings', 'enforcement', domain, wanted)
        command.run('restore')
    return result


def installed_levels(command):
    by_level = command.ask('secpolicy.status/1', 'status')['domainsByLevel']
    return {domain: level for level, domains in by_level.items() for domain in domains}


def main():
    module = AnsibleModule(
        argument_spec=dict(domain=dict(type='list', elements='str', required=True),
                           level=dict(type='str', required=True, choices=['enforcing', 'permissive', 'disabled']),
                           **ROOT_ARGUMENT),
        supports_check_mode=True)
    run_module(module, set_levels)


if __name__ == '__main__':
    main()
