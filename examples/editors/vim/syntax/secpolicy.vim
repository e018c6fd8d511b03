" Policy files of libsecpolicy: domains, objects, file labels and tardisks.
if exists('b:current_syntax')
  finish
endif

" Words are compared exactly, and a # begins a comment wherever it stands.
syntax case match
syntax match secpolicyComment /#.*/ contains=@Spell
syntax match secpolicyKind /^ *\zs-[acdfprsuE]\ze\( \|$\)/
syntax match secpolicyGrant / \zsgrant\ze *\(#\|$\)/
syntax match secpolicyRevoke / \zsrevoke\ze *\(#\|$\)/
syntax match secpolicyCapability /\<cap_\w\+/
syntax match secpolicyCallSet /@\w\+/
syntax match secpolicyPath "\( \|^\)\zs/[^ #]*"
syntax match secpolicyNumber / \zs\(0x\x\+\|\d\+\)\ze\( \|#\|$\)/
" Part of a word, which is hardly meant.
syntax match secpolicyTab /\t/

highlight default link secpolicyComment Comment
highlight default link secpolicyKind Keyword
highlight default link secpolicyGrant Statement
highlight default link secpolicyRevoke Exception
highlight default link secpolicyCapability Constant
highlight default link secpolicyCallSet Function
highlight default link secpolicyPath String
highlight default link secpolicyNumber Number
highlight default link secpolicyTab Error

let b:current_syntax = 'secpolicy'
