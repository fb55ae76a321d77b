#!/bin/sh
# Stands at /usr/vela/bin/convert-thumb in front of ImageMagick's convert, which is linked as
# /usr/vela/lib/convert-thumb so that the process keeps its name.
#
# ImageMagick takes a photo's name for more than a name: one with a wildcard stands for other files,
# or makes it read the photo's content as a list of further arguments, options to write elsewhere
# included; a number format or a doubled percent sign in front of a page selection names another
# file. Such a photo is refused here, and gets its failure markers, rather than another's picture.
set -eu
LC_ALL=C
export LC_ALL

source_argument() {
  while [ "$#" -ge 2 ]; do
    case $1 in
      -define | -rotate) shift 2 ;;
      *) break ;;
    esac
  done
  source=${1-}
}

is_misread() {
  case $source in
    @*) return 0 ;;
    *%[dox]*'[0]' | *%[0-9]*[dox]*'[0]' | *%%*'[0]' | *%\[*'[0]') return 0 ;;
  esac
  name=${source##*/}
  case ${name%'[0]'} in
    *[][*?{}]*) return 0 ;;
  esac
  return 1
}

source_argument "$@"
if is_misread; then
  echo "convert-thumb: ImageMagick cannot be given this name: $source" >&2
  exit 1
fi
exec /usr/vela/lib/convert-thumb "$@"
