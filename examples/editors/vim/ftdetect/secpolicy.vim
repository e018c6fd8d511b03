" The files of a security policy, wherever the policy lies: its directories are called so.
function! s:IsPolicy(dir) abort
  return isdirectory(a:dir . '/domains') && isdirectory(a:dir . '/objects')
endfunction

autocmd BufNewFile,BufRead */domains/*,*/objects/*,*/fileLabels/*,*/tardisks/*
      \ if s:IsPolicy(expand('<afile>:p:h:h')) || s:IsPolicy(expand('<afile>:p:h:h:h')) |
      \   setfiletype secpolicy |
      \ endif
