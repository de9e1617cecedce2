# SPDX-License-Identifier: MIT
# fish completion for brivoctl(1). Subcommands and options are those that the program's own help names.

# The subcommand in front of the cursor; of access, both words.
function __brivoctl_command
    set -l words (commandline -opc | string match -v -- '-*')[2..]
    set -l depth 1
    test "$words[1]" = access; and set depth 2
    string join \n -- $words[1..$depth]
end

# Whether that subcommand is one of these; "" stands for none yet.
function __brivoctl_at
    set -l command (__brivoctl_command)
    contains -- "$command" $argv
end

# Whether the option in front of the cursor takes a value, which is then what is being typed.
function __brivoctl_in_value
    contains -- (commandline -opc)[-1] -o --output --receipt -d --directory --address --timeout --offset --length --size --columns --limit
end

function __brivoctl_help
    command brivoctl (__brivoctl_command) --help 2>/dev/null
end

function __brivoctl_subcommands
    __brivoctl_help | sed -nE '/^Subcommands:/,/^$/s/^  ([a-z]+) +(.*)/\1\t\2/p'
end

function __brivoctl_options
    __brivoctl_help | sed -nE '/^Options:/,/^$/{s/^  ((-[a-z]),)?(--[a-z-]+)( [^ ]+)*( {2,}(.*))?$/\3\t\6\n\2\t\6/p}' | string match -r '^-.*'
end

# A device, by its name or, for a word that begins like one, by its mount path.
function __brivoctl_devices
    set -l key name
    string match -q '/*' -- (commandline -ct); and set key path
    command brivoctl devices --json --timeout 2 2>/dev/null | sed -nE '/\\\\u/d; s/^ *"'$key'": "(.*)",?$/\1/p' | string replace -ar '\\\\(.)' '$1'
end

function __brivoctl_identifiers
    command brivoctl access list --json 2>/dev/null | sed -nE 's/^ *"identifier": "(.*)",?$/\1/p'
end

complete -c brivoctl -f
complete -c brivoctl -n 'not __brivoctl_in_value; and __brivoctl_at "" access' -a '(__brivoctl_subcommands)'
complete -c brivoctl -n 'not __brivoctl_in_value; and string match -q -- "-*" (commandline -ct)' -a '(__brivoctl_options)'
complete -c brivoctl -n 'not __brivoctl_in_value; and __brivoctl_at ls info read rm thumb sheet get import' -a '(__brivoctl_devices)'
complete -c brivoctl -n 'not __brivoctl_in_value; and __brivoctl_at "access revoke"' -a '(__brivoctl_identifiers)'
complete -c brivoctl -n 'not __brivoctl_in_value; and __brivoctl_at dataset "access grant" "access ask"' -F
complete -c brivoctl -n 'contains -- (commandline -opc)[-1] -o --output --receipt' -F
complete -c brivoctl -n 'contains -- (commandline -opc)[-1] -d --directory' -a '(__fish_complete_directories)'
