# Functions of scripts/run: what velathumb-status knows about a tree.
# shellcheck shell=bash

readonly STATUS=$BUILD/programs/velathumb-status/velathumb-status

# Adds the state of directories, a JSON object, to a file. What cannot be read is skipped, as
# velathumb does.
ask_status() { # STATE OPTION-OR-DIRECTORY...
  local state=$1 code=0 size
  size=$(stat -c %s "$state")
  "$STATUS" --json --photos "${@:2}" >>"$state" 2>"$state.log" || code=$?
  if ((code > 2 || $(stat -c %s "$state") == size)); then
    fail "velathumb-status failed with status $code: $(tail -n 1 "$state.log")"
  fi
}

# Stores the state of a tree in a file. Some names exclude a directory from a walk even when it
# starts there: the state then consists of that of the directory and of those in it.
read_state() { # TREE STATE
  local device
  local -a below
  : >"$2"
  ask_status "$2" --recursive "$1"
  if (($(query '[directories] | length' "$2") > 0)); then
    return
  fi
  IS_EXCLUDED=1
  : >"$2"
  ask_status "$2" "$1"
  device=$(stat -c %d "$1")
  mapfile -d '' -t below < <(find -L "$1" -mindepth 1 -maxdepth 1 -type d -printf '%D%p\0' \
    2>/dev/null | sed -zn "s,^$device/,/,p" | sort -z)
  if ((${#below[@]} > 0)); then
    ask_status "$2" --recursive "${below[@]}"
  fi
}

# Prints the result of a filter with the definitions of tree-state.jq.
query() { # FILTER STATE [JQ OPTION]...
  jq -L "$ROOT/scripts" -sr "${@:3}" "include \"tree-state\"; $1" "$2"
}

# Prints the paths that a query gives in base 64, each with a NUL at its end.
query_paths() { # FILTER STATE
  query "$1, end64" "$2" | base64 -d
}

list_directories() { # STATE
  query_paths 'directories | path64' "$1"
}

# The path of the first photo in a state that meets a condition; empty without one.
first_photo() { # CONDITION STATE
  local path=
  IFS= read -r -d '' path < <(query_paths "first_photo($1)" "$2") || true
  printf '%s' "$path"
}
