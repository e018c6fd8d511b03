" Only spaces separate words in a policy file, and a comment begins with #.
if exists('b:did_ftplugin')
  finish
endif
let b:did_ftplugin = 1

setlocal expandtab commentstring=#\ %s comments=:# iskeyword+=-,@-@
let b:undo_ftplugin = 'setlocal expandtab< commentstring< comments< iskeyword<'
