# fish completion for secpolicy(8): the command itself says what can stand at the cursor, since it knows
# its verbs and options, and what is installed.

function __secpolicy_words
    set -l typed (commandline -opc)
    set -l current (commandline -ct)
    set -l answer (command $typed[1] __complete $typed[2..] $current 2>/dev/null)
    switch "$answer[1]"
        case programs
            complete -C "$current"
        case files
            __fish_complete_path $current
        case directories
            __fish_complete_directories $current
    end
    string join -- \n $answer[2..]
end

complete -c secpolicy -f -a '(__secpolicy_words)'
