# Functions of scripts/run that read the state of a tree from velathumb-status.
# shellcheck shell=bash

readonly STATUS=$BUILD/programs/velathumb-status/velathumb-status

# Appends the state of directories, a JSON object, to a file. Like velathumb, skips what cannot be
# read.
append_status() { # STATE OPTION-OR-DIRECTORY...
  local state=$1 code=0 size
  size=$(stat -c %s "$state")
  "$STATUS" --json --photos "${@:2}" >>"$state" 2>"$state.log" || code=$?
  if ((code > 2 || $(stat -c %s "$state") == size)); then
    fail "velathumb-status failed with status $code: $(tail -n 1 "$state.log")"
  fi
}

# Stores the state of a tree in a file. Some names exclude a directory from a walk even if the walk
# starts there; the states of the directory and of its subdirectories are then read separately.
read_state() { # TREE STATE
  local device
  local -a below
  : >"$2"
  append_status "$2" --recursive "$1"
  if (($(query '[directories] | length' "$2") > 0)); then
    return
  fi
  IS_EXCLUDED=1
  : >"$2"
  append_status "$2" "$1"
  device=$(stat -c %d "$1")
  mapfile -d '' -t below < <(find -L "$1" -mindepth 1 -maxdepth 1 -type d -printf '%D%p\0' \
    2>/dev/null | sed -zn "s,^$device/,/,p" | sort -z)
  if ((${#below[@]} > 0)); then
    append_status "$2" --recursive "${below[@]}"
  fi
}

# Prints the result of a filter that may use the definitions of tree-state.jq.
query() { # FILTER STATE [JQ OPTION]...
  jq -L "$ROOT/scripts" -sr "${@:3}" "include \"tree-state\"; $1" "$2"
}

# Decodes the base64 paths that a query returns and prints each with a NUL at the end.
query_paths() { # FILTER STATE
  query "$1, end64" "$2" | base64 -d
}

list_directories() { # STATE
  query_paths 'directories | path64' "$1"
}

# Prints the path of the first photo that meets a condition, or nothing.
first_photo() { # CONDITION STATE
  local path=
  IFS= read -r -d '' path < <(query_paths "first_photo($1)" "$2") || true
  printf '%s' "$path"
}
