#!/bin/sh
# Wrapper for ImageMagick's convert, installed as /usr/vela/bin/convert-thumb. It runs convert
# through the link /usr/vela/lib/convert-thumb so that the process keeps its name.
#
# ImageMagick interprets special characters in file names: wildcards match other files, "@" makes it
# read the content of the file as further arguments, which may write to other files, and a number
# format or a doubled percent sign before a page selection refers to another file. This script
# rejects such names, so the photo gets failure markers instead of thumbnails of another picture.
#
# It also rejects files that are no photos, and limits ImageMagick to photos by the policy in
# /usr/vela/share/imagemagick. Unlike the project's own converter, it does not protect from users who
# exchange files while it is running: ImageMagick opens the photo and the outputs by their names.
set -eu
LC_ALL=C
MAGICK_CONFIGURE_PATH=/usr/vela/share/imagemagick
XDG_CONFIG_HOME=$MAGICK_CONFIGURE_PATH/last
export LC_ALL MAGICK_CONFIGURE_PATH XDG_CONFIG_HOME

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

# By the first bytes: JPEG, PNG, GIF, BMP, TIFF, PSD, PBM to PAM, WebP, JPEG 2000, HEIC and AVIF.
# TGA has no signature.
is_photo() { # FILE
  case $1 in
    *.tga | *.TGA) return 0 ;;
  esac
  case $(od -An -v -tx1 -N12 -- "$1" | tr -d ' \n') in
    ffd8* | 89504e470d0a1a0a* | 4749463837* | 4749463839* | 424d* | 4241* | 38425053*) return 0 ;;
    49492a00* | 4d4d002a* | 49492b00* | 4d4d002b* | 503[1-7]*) return 0 ;;
    52494646????????57454250 | ????????6a502020* | ff4fff51*) return 0 ;;
    ????????6674797068656963 | ????????6674797068656978 | ????????667479706865696d) return 0 ;;
    ????????6674797068656973 | ????????6674797068657663 | ????????6674797068657678) return 0 ;;
    ????????667479706d696631 | ????????667479706d736631 | ????????667479706d696166) return 0 ;;
    ????????6674797061766966 | ????????6674797061766973) return 0 ;;
  esac
  return 1
}

source_argument "$@"
if is_misread; then
  echo "convert-thumb: ImageMagick cannot be given this name: $source" >&2
  exit 1
fi
photo=${source%'[0]'}
# The policy refuses names that begin with a pipe sign, which could also be commands.
for argument do
  shift
  case $argument in
    '|'*) argument=./$argument ;;
  esac
  set -- "$@" "$argument"
done
if [ -f "$photo" ] && ! is_photo "$photo"; then
  echo "convert-thumb: not a photo in a known format: $photo" >&2
  exit 1
fi
exec /usr/vela/lib/convert-thumb "$@"
