# Bash completion for velathumb-status.

_velathumb_status() {
  local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  local options='-p -r -q -w -j -0 -h --photos --recursive --failed --null --check-videos --html --queue
    --progress --resume-time --security --check-config --watch --json --help --version'
  compopt -o filenames 2>/dev/null
  # Bash treats the equals sign as a separate word.
  if [[ $previous == '=' ]]; then
    previous=${COMP_WORDS[COMP_CWORD - 2]}
  fi
  if [[ $previous == @(--html|--check-config) ]]; then
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  elif [[ $current == -* ]]; then
    compopt +o filenames 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -W "$options" -- "$current")
  else
    mapfile -t COMPREPLY < <(compgen -d -- "$current")
  fi
}

complete -F _velathumb_status velathumb-status
