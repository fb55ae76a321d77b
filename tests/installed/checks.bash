# What the cases of tests/installed/cases are made of. Sourced there; runs inside the machine.
# shellcheck shell=bash

readonly SHARE=/run/share
readonly QUEUE=/var/spool/thumb_create.queue
readonly SIZES=(S SM M B L XL)
readonly RUNNER=velathumb-queue.service
readonly DAEMON=velaindexplugind.service

# --- results --------------------------------------------------------------------------------------

failures=0

fails() { # MESSAGE
  printf '    FAILED: %s\n' "$1"
  failures=$((failures + 1))
}

expect() { # WHAT COMMAND [ARGUMENT]...
  "${@:2}" || fails "$1"
}

refuse() { # WHAT COMMAND [ARGUMENT]...
  ! "${@:2}" || fails "$1"
}

expect_equal() { # WHAT ACTUAL EXPECTED
  [[ $2 == "$3" ]] || fails "$1 is '$2', not '$3'"
}

# Fails when the event does not happen in time.
wait_for() { # SECONDS WHAT COMMAND [ARGUMENT]...
  local end=$((SECONDS + $1 + 1))
  until "${@:3}"; do
    if ((SECONDS >= end)); then
      fails "not within $1 s: $2"
      return 0
    fi
    sleep 0.05
  done
}

# Fails when the command fails or takes a second or more.
within_a_second() { # WHAT COMMAND [ARGUMENT]...
  local start=${EPOCHREALTIME/./} took
  "${@:2}" || fails "$1 failed"
  took=$((${EPOCHREALTIME/./} - start))
  note "$1 took $((took / 1000)) ms"
  ((took < 1000000)) || fails "$1 took a second or more"
}

note() { # TEXT
  printf '    %s\n' "$1"
}

# Prints the case's name, time and outcome on a line, and after it what the case has printed.
run_case() { # NAME
  local before=$failures start=${EPOCHREALTIME/./} log=/run/case.log took
  printf '%-45s' "${1//_/ }"
  # The cases start units more often than systemd permits in ten seconds.
  systemctl reset-failed 'vela*' 2>/dev/null
  JOURNAL_START=$(journalctl -n 0 --show-cursor | sed -n 's/^-- cursor: //p')
  "$1" >"$log" 2>&1
  took=$(((${EPOCHREALTIME/./} - start) / 100000))
  printf '%4d.%d s  %s\n' $((took / 10)) $((took % 10)) \
    "$( ((failures > before)) && echo FAILED || echo ok)"
  cat "$log"
  if ((failures > before)); then
    show_journal
  fi
}

show_journal() {
  printf '    the journal of the services meanwhile:\n'
  journal -u 'vela*' | tail -n 60 | sed 's/^/      /'
}

# --- services -------------------------------------------------------------------------------------

# Prints the messages since the case began.
journal() { # [OPTION]...
  journalctl -q --after-cursor="$JOURNAL_START" -o cat "$@"
}

journal_has() { # UNIT TEXT
  grep -qF -- "$2" < <(journal -u "$1")
}

has_reached() { # TARGET
  grep -qF "Reached target $1" < <(journal)
}

property() { # UNIT NAME
  systemctl show -p "$2" --value "$1"
}

has_state() { # UNIT STATE
  [[ $(property "$1" ActiveState) == "$2" ]]
}

# Prints the first of these files of a control group, in whichever hierarchy it is; nothing if there is
# none.
control_group_file() { # GROUP NAME...
  local name hierarchy
  for name in "${@:2}"; do
    for hierarchy in '' /unified /memory /pids; do
      cat "/sys/fs/cgroup$hierarchy$1/$name" 2>/dev/null && return
    done
  done
}

# Prints the names of the processes of the services and of their tools.
processes() {
  cat /proc/[0-9]*/comm 2>/dev/null | grep -E '^(vela|convert|dcraw|header-reader)' || true
}

main_process() { # UNIT
  property "$1" MainPID
}

# --- photos and the queue -------------------------------------------------------------------------

add() { # ENTRY
  velathumb-queue --queue-only --add "$1" >/dev/null 2>&1 || fails "cannot queue $1"
}

is_idle() {
  [[ ! -e $QUEUE && ! -e $QUEUE.tmp ]] && has_state "$RUNNER" inactive
}

count() { # DIRECTORY NAME
  find "$1" -path '*/@eaDir/*' -name "$2" -type f 2>/dev/null | wc -l
}

thumbs() { # DIRECTORY
  count "$1" 'VELAPHOTO_THUMB_*.jpg'
}

has_thumbs() { # DIRECTORY NUMBER
  (($(thumbs "$1") >= $2))
}

# Copies one photo under several names.
make_tree() { # DIRECTORY NUMBER
  local i
  mkdir -p "$1"
  for ((i = 0; i < $2; ++i)); do
    cp "$SHARE/photos/camera.jpg" "$1/photo $i.jpg"
  done
}

# Prints the photos of a tree that lack a thumbnail.
incomplete_photos() { # DIRECTORY
  local photo
  find "$1" -type f ! -path '*/@eaDir/*' | while IFS= read -r photo; do
    (($(thumbs "${photo%/*}/@eaDir/${photo##*/}") == ${#SIZES[@]})) || echo "$photo"
  done
}

# Prints the owners and modes that the metadata directories and thumbnails of a tree have, each once.
modes_of_metadata() { # DIRECTORY
  find "$1" -path '*/@eaDir*' -printf '%y %u %m\n' | sort -u
}

# Fails unless all photos of a directory have all thumbnails and nothing else is beside them.
expect_complete() { # DIRECTORY PHOTOS
  expect_equal "photos of $1 that lack a thumbnail" "$(incomplete_photos "$1")" ""
  expect_equal "the number of thumbnails below $1" "$(thumbs "$1")" $(($2 * ${#SIZES[@]}))
  expect_equal "the number of other files below $1" \
    "$(find "$1" -path '*/@eaDir/*' -type f ! -name 'VELAPHOTO_THUMB_*.jpg' | wc -l)" 0
}

# Processes a tree to its end.
process() { # DIRECTORY PHOTOS
  add "R:$1"
  wait_for 60 "all thumbnails of $1" has_thumbs "$1" $(($2 * ${#SIZES[@]}))
  wait_for 20 "the end of the run" is_idle
}
