#!/bin/sh
# Wrapper for ImageMagick's convert, installed as /usr/vela/bin/convert-thumb. It runs convert
# through the link /usr/vela/lib/convert-thumb so that the process keeps its name.
#
# ImageMagick interprets special characters in file names: wildcards match other files, "@" makes it
# read the content of the file as further arguments, which may write to other files, and a number
# format or a doubled percent sign before a page selection refers to another file. This script
# rejects such names, so the photo gets failure markers instead of thumbnails of another picture.
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
