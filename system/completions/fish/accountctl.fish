# fish completion for accountctl; commands and options are those that its help lists.

# The program with the options of the command line that say which device is meant.
function __accountctl
    set -l device
    set -l words (commandline -opc)
    for index in (seq 2 (count $words))
        switch $words[$index]
            case '--root=*' '--home=*' '--resources=*'
                set -a device $words[$index]
            case --root --home --resources
                set -a device $words[$index] $words[(math $index + 1)]
        end
    end
    $words[1] $device $argv 2>/dev/null
end

# What stands before the cursor and is no option: the command and its arguments.
function __accountctl_words
    set -l skips no
    for word in (commandline -opc)[2..-1]
        if test $skips = yes
            set skips no
            continue
        end
        switch $word
            case --root --home --resources --columns --file --snapshots --set
                set skips yes
            case '-*'
            case '*'
                echo $word
        end
    end
end

# Whether the next word is argument NUMBER of one of the commands.
function __accountctl_wants -a number
    set -l words (__accountctl_words)
    test (count $words) -eq $number; and contains -- "$words[1]" $argv[2..-1]
end

function __accountctl_needs_command
    test (count (__accountctl_words)) -eq 0
end

function __accountctl_commands
    __accountctl --help | string match -rg '^  ([a-z][a-z-]*) '
end

function __accountctl_identifiers
    __accountctl --json list | string match -rg '^ *"identifier": "(.*)",?$'
end

function __accountctl_types
    __accountctl --json types | string match -rg '^ *"type": "(.*)",?$'
end

function __accountctl_dataclasses
    __accountctl --json types | string match -rg '^ *"com\.vorlix\.Dataclass\.(.*)",?$' | sort -u
end

complete -c accountctl -f
complete -c accountctl -n __accountctl_needs_command -a '(__accountctl_commands)'
complete -c accountctl -n '__accountctl_wants 1 help' -a '(__accountctl_commands)'
complete -c accountctl -n '__accountctl_wants 1 show enable disable rename set remove' -a '(__accountctl_identifiers)'
complete -c accountctl -n '__accountctl_wants 2 enable disable' -a '(__accountctl_dataclasses)'
complete -c accountctl -n '__accountctl_wants 1 add' -a '(__accountctl_types)'
complete -c accountctl -n '__accountctl_wants 1 verify diff recover check-modules' -F
complete -c accountctl -n '__accountctl_wants 1 new-device' -a '(__fish_complete_directories)'
complete -c accountctl -n '__accountctl_wants 2 diff' -F
complete -c accountctl -l root -r -a '(__fish_complete_directories)'
complete -c accountctl -l home -r -a '(__fish_complete_directories)'
complete -c accountctl -l resources -r -a '(__fish_complete_directories)'
complete -c accountctl -l modules
complete -c accountctl -l file -r -F
complete -c accountctl -l snapshots -r -a '(__fish_complete_directories)'
complete -c accountctl -l set -x
complete -c accountctl -l dry-run
complete -c accountctl -l drop-unreadable
complete -c accountctl -l json
complete -c accountctl -l columns -x -a 'identifier type class name user host enabled'
complete -c accountctl -l wide
complete -c accountctl -l color -a 'auto always never'
complete -c accountctl -l help -s h
complete -c accountctl -l version
