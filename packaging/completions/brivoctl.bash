# SPDX-License-Identifier: MIT
# bash completion for brivoctl(1). Subcommands and options are those that the program's own help names.

_brivoctl_subcommands() { "$@" --help 2>/dev/null | sed -nE '/^Subcommands:/,/^$/s/^  ([a-z]+) .*/\1/p'; }
_brivoctl_options() { "$@" --help 2>/dev/null | sed -nE '/^Options:/,/^$/s/^  (-[^ ]+).*/\1/p' | tr ',' '\n'; }

# _brivoctl_values KEY COMMAND...: the texts under a key in what the command prints as JSON.
_brivoctl_values() {
  "${@:2}" --json 2>/dev/null | sed -nE '/\\u/d; s/^ *"'"$1"'": "(.*)",?$/\1/p' | sed -E 's/\\(.)/\1/g'
}

# Takes the lines that begin with the current word; quotes them where the shell would take them apart.
_brivoctl_offer() {
  local line
  while IFS= read -r line; do
    [[ $line == "$typed"* ]] || continue
    if [[ -z $quote ]]; then
      COMPREPLY+=("$(printf %q "$line")")
    elif [[ $line != *[\\\"\'\$\`]* ]]; then
      COMPREPLY+=("$line")
    fi
  done
}

_brivoctl_files() {
  compopt -o filenames 2>/dev/null
  mapfile -t COMPREPLY < <(compgen "$@" -- "$typed")
}

# A device, by its name or, for a word that begins like one, by its mount path.
_brivoctl_device() {
  local key=name
  [[ $typed == /* ]] && key=path
  _brivoctl_offer < <(_brivoctl_values "$key" "$program" devices --timeout 2)
}

_brivoctl_argument() {
  case "$*" in
    "" | access) _brivoctl_offer < <(_brivoctl_subcommands "$program" "$@") ;;
    ls | info | read | rm | thumb | sheet | get | import) _brivoctl_device ;;
    "access grant" | "access ask") _brivoctl_files -f ;;
    "access revoke") _brivoctl_offer < <(_brivoctl_values identifier "$program" access list) ;;
    dataset) _brivoctl_files -f ;;
  esac
}

_brivoctl() {
  local program=${COMP_WORDS[0]} typed=${COMP_WORDS[COMP_CWORD]} quote= words=() word option=
  COMPREPLY=()
  if [[ $typed == [\"\']* ]]; then
    quote=${typed:0:1}
    typed=${typed:1}
  else
    typed=${typed//\\/}
  fi
  for word in "${COMP_WORDS[@]:1:COMP_CWORD-1}"; do  # the subcommand, then its arguments
    [[ $word == -* || -n $option ]] || words+=("$word")
    option=
    case $word in
      -o | --output | --receipt | -d | --directory) option=$word ;;
      --address | --timeout | --offset | --length | --size | --columns | --limit) option=$word ;;
    esac
  done
  case $option in
    -o | --output | --receipt) _brivoctl_files -f ;;
    -d | --directory) _brivoctl_files -d ;;
    --*) ;;  # a number or an address
    *)
      if [[ $typed == -* ]]; then
        local depth=1
        [[ ${words[0]-} == access ]] && depth=2
        _brivoctl_offer < <(_brivoctl_options "$program" "${words[@]:0:depth}")
      else
        _brivoctl_argument "${words[@]}"
      fi
      ;;
  esac
}
complete -F _brivoctl brivoctl
