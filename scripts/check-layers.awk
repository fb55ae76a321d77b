# Reads tables (see scripts/check-layers) and then source files; prints the faults of their
# includes.

# Returns the part of the tree with its own order of layers: src or programs/NAME.
function part_of(path) {
  return match(path, /^programs\/[^\/]*/) ? substr(path, 1, RLENGTH) : "src"
}

# A file that is listed in the order of the layers counts as a folder.
function folder_of(file) {
  if (!(file in placed)) sub(/\/[^\/]*$/, "", file)
  return file
}

function without_dots(path) {
  while (match(path, /[^\/]+\/\.\.\//)) {
    path = substr(path, 1, RSTART - 1) substr(path, RSTART + RLENGTH)
  }
  return path
}

# Returns the file of a quoted include: next to the including file, below src/ or below the program.
function find_target(file, name, folder) {
  folder = file
  sub(/[^\/]*$/, "", folder)
  if (without_dots(folder name) in files) return without_dots(folder name)
  if (without_dots("src/" name) in files) return without_dots("src/" name)
  if (without_dots(part_of(file) "/" name) in files) return without_dots(part_of(file) "/" name)
  return ""
}

function fault(message) {
  printf "%s:%d: %s\n", FILENAME, FNR, message
}

function is_below(upper, lower, order) {
  for (order = 1; order <= orders; ++order) {
    if (level[order, upper] && level[order, upper] < level[order, lower]) return 1
  }
  return 0
}

function may_include(from, to) {
  if (from == to) return 1
  if (part_of(from) != part_of(to)) {
    return part_of(to) == "src" && (!(to in closed) || closed[to] == part_of(from))
  }
  return !(part_of(from) in ordered) || is_below(from, to)
}

function check_folder(folder) {
  if (!(part_of(folder) in ordered) || folder in placed) return
  fault(folder " has no place in the order of the layers")
  placed[folder]
}

function check_own(name, target, from, to) {
  target = find_target(FILENAME, name)
  if (target == "") {
    fault("includes \"" name "\", which is neither in src/ nor in the program")
    return
  }
  from = folder_of(FILENAME)
  to = folder_of(target)
  if (!may_include(from, to)) fault("includes " target ": " from " may not include " to)
  if (target == FILENAME) fault("includes itself")
  print FILENAME, target, FILENAME ":" FNR >file_graph
  if (from != to) print from, to, FILENAME ":" FNR >folder_graph
}

function check_system(name, folder) {
  if (name !~ system_headers) return
  system_files += !(FILENAME in uses_system)
  uses_system[FILENAME]
  for (folder in system_folders) if (index(FILENAME, folder "/") == 1) return
  if (FILENAME in reason) needed[FILENAME]
  else fault("includes <" name ">: neither in a folder that wraps the system nor on the allow-list")
}

# Calls by which a file is opened or changed under its path: where other users can change the
# directory, the path may lead elsewhere at the next call.
function check_calls(line, folder) {
  for (folder in path_folders) if (index(FILENAME, folder "/") == 1) return
  gsub(/"([^"\\]|\\.)*"/, "", line)
  sub(/\/\/.*/, "", line)
  if (line !~ path_calls) return
  if (FILENAME in path_reason) {
    calls_paths[FILENAME]
    return
  }
  fault("opens or changes a file by its path: use posix/folder.h")
}

# Faults of an allow-list.
function check_list(list, used, what, file) {
  for (file in list) {
    if (!(file in used)) printf "%s:1: is on the list of %s, which it does not need\n", file, what
    else if (list[file] == "") printf "%s:1: is on the list of %s without a reason\n", file, what
  }
}

BEGIN {
  printf "" >file_graph
  printf "" >folder_graph
}

input == "order" {
  ++orders
  current = 1
  part = substr($1, 1, length($1) - 1)
  ordered[part]
  for (i = 2; i <= NF; ++i) {
    if ($i == ">") ++current
    else if ($i !~ /^[{}]$/) {
      level[orders, part "/" $i] = current
      placed[part "/" $i]
    }
  }
  next
}
input == "closed" { closed[$1] = $2; next }
input == "system" { system_folders[$1]; next }
input == "allowed" && NF > 0 { file = $1; $1 = ""; reason[file] = $0; next }
input == "path_folders" { path_folders[$1]; next }
input == "paths" && NF > 0 { file = $1; $1 = ""; path_reason[file] = $0; next }
# A header that the build writes is included without the ".in" of its template.
input == "files" { sub(/\.in$/, "", $1); files[$1]; ++file_count; next }

FNR == 1 { check_folder(folder_of(FILENAME)) }
match($0, /^[ \t]*#[ \t]*include[ \t]*"[^"]*"/) { split($0, words, "\""); check_own(words[2]) }
match($0, /^[ \t]*#[ \t]*include[ \t]*<[^>]*>/) { split($0, words, /[<>]/); check_system(words[2]) }
{ check_calls($0) }

END {
  check_list(reason, needed, "system headers")
  check_list(path_reason, calls_paths, "paths")
  printf "%d of %d product files (%.1f %%) include POSIX or Linux headers; allowed are %d %%\n",
    system_files, file_count, 100 * system_files / file_count, max_percent >share
  exit 100 * system_files > max_percent * file_count
}
