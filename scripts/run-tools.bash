# Functions of scripts/run: build velathumb, install the tools that it runs, draw sample photos.
# shellcheck shell=bash

ROOT=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
readonly ROOT
readonly BUILD=$ROOT/build/run
readonly TOOLS=/usr/vela/bin
readonly CONVERTER=${VELA_CONVERTER:-own}
readonly OWN_CONVERTER=$BUILD/programs/convert-thumb/convert-thumb
readonly CONVERTER_FRONT=$ROOT/programs/convert-thumb/convert-thumb.sh
readonly CONVERTER_LINK=/usr/vela/lib/convert-thumb
readonly POLICY=$ROOT/config/imagemagick
readonly POLICY_PLACE=/usr/vela/share/imagemagick

say() { printf '==> %s\n' "$*"; }

fail() {
  printf 'run: %s\n' "$*" >&2
  exit 1
}

build() {
  say "Building velathumb in build/run"
  cd "$ROOT" || return
  cmake --preset release -B "$BUILD" --log-level=WARNING \
    -DVELA_BUILD_TESTS=OFF -DVELA_BUILD_BENCH=OFF >/dev/null
  cmake --build "$BUILD"
}

# Prints the path of ImageMagick's program; PATH may contain another program named convert.
imagemagick_convert() {
  local candidate
  for candidate in /usr/bin/convert-im7.q16 /usr/bin/convert-im6.q16 /usr/bin/convert; do
    if [[ -x $candidate ]]; then
      echo "$candidate"
      return
    fi
  done
  fail "ImageMagick's convert is not in /usr/bin"
}

link_tool() { # LINK TARGET
  local tool=$1 target=$2
  if [[ -f $tool && -x $tool ]]; then
    return
  fi
  say "Linking $tool to $target"
  local purpose="link $tool to $target"
  "$ROOT/scripts/as-root" "$purpose" mkdir -p "${tool%/*}"
  "$ROOT/scripts/as-root" "$purpose" ln -sfn "$target" "$tool"
}

# Prints the path of the converter to install.
chosen_converter() {
  case $CONVERTER in
    own) echo "$OWN_CONVERTER" ;;
    imagemagick) echo "$CONVERTER_FRONT" ;;
    *) fail "VELA_CONVERTER must be own or imagemagick, not '$CONVERTER'" ;;
  esac
}

# Returns 0 if a file is any version of this project's converters: both the script and the program
# contain the path of the link to ImageMagick's convert.
is_our_converter() { # FILE
  grep -qaF "$CONVERTER_LINK" "$1"
}

# Replaces older versions of this project's converters, but keeps any other converter.
place_converter() {
  local tool=$TOOLS/convert-thumb converter
  converter=$(chosen_converter)
  if cmp -s "$converter" "$tool"; then
    return
  fi
  if [[ -e $tool && ! -L $tool ]] && ! is_our_converter "$tool"; then
    say "Keeping $tool: not a converter of this project"
    return
  fi
  say "Installing $tool"
  local purpose="install $tool"
  "$ROOT/scripts/as-root" "$purpose" mkdir -p "$TOOLS"
  "$ROOT/scripts/as-root" "$purpose" install -m 0755 "$converter" "$tool"
}

# Installs what limits ImageMagick to photos. Each file is replaced when it differs.
place_policy() {
  local file purpose="install $POLICY_PLACE"
  for file in policy.xml last/ImageMagick/policy.xml; do
    if ! cmp -s "$POLICY/$file" "$POLICY_PLACE/$file"; then
      say "Installing $POLICY_PLACE/$file"
      "$ROOT/scripts/as-root" "$purpose" install -D -m 0644 "$POLICY/$file" "$POLICY_PLACE/$file"
    fi
  done
}

place_tools() {
  local convert
  place_policy
  convert=$(imagemagick_convert)
  link_tool "$CONVERTER_LINK" "$convert"
  place_converter
  link_tool "$TOOLS/exiftool" /usr/bin/exiftool
}

draw() { # SIZE COLOURS OPTION... OUTPUT
  local size=$1 colours=$2 convert
  shift 2
  convert=$(imagemagick_convert)
  "$convert" -size "$size" "gradient:$colours" \
    -fill white -draw 'circle 700,500 700,300' -draw 'rectangle 60,60 500,160' "$@"
}

draw_samples() { # DIRECTORY
  local dir=$1
  mkdir -p "$dir/second folder"
  draw 3000x2000 skyblue-seagreen -quality 90 "$dir/landscape.jpg"
  draw 2000x3000 gold-firebrick -quality 90 "$dir/portrait.jpg"
  draw 3000x2000 plum-navy -quality 90 "$dir/turned by its EXIF tag.jpg"
  "$TOOLS/exiftool" -q -overwrite_original -n -Orientation=6 "$dir/turned by its EXIF tag.jpg"
  draw 1600x1200 white-black -alpha set -channel A -evaluate multiply 0.5 \
    "$dir/second folder/transparent.png"
  draw 1400x1050 orange-purple '(' +clone -negate ')' "$dir/second folder/animated.gif"
  draw 2400x1600 khaki-teal -compress lzw "$dir/second folder/scan.tif"
  head -c 300 "$dir/landscape.jpg" >"$dir/damaged.jpg"
}

make_samples() { # DIRECTORY
  if [[ -d $1 ]]; then
    say "Using the sample photos in ${1#"$ROOT/"}"
    return
  fi
  say "Making sample photos in ${1#"$ROOT/"}"
  rm -rf "$1.part"
  draw_samples "$1.part"
  mv "$1.part" "$1"
}
