# Copyright (c) 2026 The libsecpolicy authors
# SPDX-License-Identifier: MIT


class ModuleDocFragment:
    DOCUMENTATION = r'''
options:
  root:
    description:
      - Work below this directory of the host as if it were its root directory, as C(secpolicy --root) does.
      - Paths in other options are as seen from there.
    type: path
    default: /
requirements:
  - secpolicy, in the path of the user who runs the module
'''
