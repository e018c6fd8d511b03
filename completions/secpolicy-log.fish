# fish completion for secpolicy-log(8).

complete -c secpolicy-log -f
complete -c secpolicy-log -l once -d 'Tell what there is, and end'
complete -c secpolicy-log -l format -x -a 'text json' -d 'How to write a refusal'
complete -c secpolicy-log -l help -d 'Print the usage'
complete -c secpolicy-log -l version -d 'Print the version'
