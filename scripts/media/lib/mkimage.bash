# Sourced by the recogniser media scripts (scripts/media/*.sh): masters one
# small image per call from entries named on the command line, so that a
# family's images can be written as a compact table.
#
#   image OUTDIR NAME [-V VOLID] [-plain|-udf] ENTRY...
#
#   -V VOLID   volume identifier (default: NAME cut to 32 characters)
#   -plain     ISO 9660 names only: no Rock Ridge, no Joliet
#   -udf       UDF bridge image (UDF and ISO 9660 with Rock Ridge and Joliet)
#   PATH=TEXT  file PATH holding TEXT with printf %b escapes (\n, \r, \x00)
#   PATH@FILE  file PATH copied from FILE (relative to $SRC/tests/data)
#   PATH/      empty directory PATH
#
# Writes OUTDIR/NAME.iso. Needs SRC (the repository) in the environment.
# With TVX_GUESS_SEEDS set to a directory, also writes the tree there in the
# input format of fuzz/guess_fuzzer.cc, as a seed of the recognition target.

image() {
  local outdir=$1 name=$2
  shift 2
  local volid=${name:0:32} mode=rr
  local tree
  tree=$(mktemp -d)
  while [ $# -gt 0 ]; do
    case $1 in
      -V) volid=$2; shift ;;
      -plain) mode=plain ;;
      -udf) mode=udf ;;
      *=*)
        local path=${1%%=*}
        mkdir -p "$tree/$(dirname "$path")"
        printf '%b' "${1#*=}" >"$tree/$path" ;;
      *@*)
        local path=${1%%@*} from=${1#*@}
        [ "${from:0:1}" = / ] || from=$SRC/tests/data/$from
        mkdir -p "$tree/$(dirname "$path")"
        cp "$from" "$tree/$path" ;;
      */) mkdir -p "$tree/$1" ;;
      *) echo "image: bad entry '$1' for $name" >&2; rm -rf "$tree"; return 1 ;;
    esac
    shift
  done
  mkdir -p "$outdir"
  if [ -n "${TVX_GUESS_SEEDS:-}" ]; then
    mkdir -p "$TVX_GUESS_SEEDS"
    seed_of "$tree" "$volid" >"$TVX_GUESS_SEEDS/$(basename "$outdir")-$name"
  fi
  local rc=0
  case $mode in
    rr) master "$outdir/$name.iso" "$tree" \
          xorriso -as mkisofs -R -J -quiet -no-pad -V "$volid" -o "$outdir/$name.iso" "$tree" ||
          rc=$? ;;
    plain) master "$outdir/$name.iso" "$tree" \
          xorriso -as mkisofs -quiet -no-pad -V "$volid" -o "$outdir/$name.iso" "$tree" ||
          rc=$? ;;
    udf) master "$outdir/$name.iso" "$tree" \
          genisoimage -quiet -udf -R -J -V "$volid" -o "$outdir/$name.iso" "$tree" || rc=$? ;;
  esac
  rm -rf "$tree"
  return $rc
}

# master IMAGE TREE TOOL ARGS...: runs the mastering command TOOL ARGS, which
# writes IMAGE from the directory TREE ("" for none); both appear among ARGS
# as they are. A command reading its program from standard input names it
# "-" among ARGS and gets it on standard input.
#
# Mastering tools are not perfectly reliable: one killed by a signal (exit
# status above 128, or xorriso reporting a caught signal) is run again, up to three times, and says so on standard
# error. Their chatter is shown only when they fail, so that a failure under
# `set -e` never goes unexplained.
#
# With TVX_MEDIA_CACHE set to a directory, an image is kept there under a
# hash of the tree (names, types, modes and contents; not times) and of the
# command, and the same content is never mastered twice: the test media and
# the demo media of one build share one cache.
master() {
  local image=$1 tree=$2 program="" key="" arg attempt rc log
  shift 2
  for arg in "$@"; do
    if [ "$arg" = - ]; then program=$(cat); break; fi
  done
  local cache=${TVX_MEDIA_CACHE:-}
  if [ -n "$cache" ]; then
    key=$(media_key "$image" "$tree" "$program" "$@")
    if [ -f "$cache/$key" ]; then
      cp "$cache/$key" "$image"
      return 0
    fi
  fi
  log=$(mktemp)
  for attempt in 1 2 3; do
    rm -f "$image"
    rc=0
    "$@" <<<"$program" >"$log" 2>&1 || rc=$?
    # xorriso catches the signal itself, says so and exits with status 1.
    if [ $rc -ne 0 ] && [ $rc -le 128 ] && grep -q '^UNIX-SIGNAL:' "$log"; then rc=$((128 + 64)); fi
    [ $rc -gt 128 ] && [ $attempt -lt 3 ] || break
    echo "master: $1 killed by a signal ($(signal_name $rc)) while mastering" \
      "$(basename "$image"); running it again (attempt $((attempt + 1)) of 3)" >&2
  done
  if [ $rc -ne 0 ]; then
    echo "master: mastering $image failed (exit $rc): $*" >&2
    cat "$log" >&2
    rm -f "$log" "$image"
    return $rc
  fi
  rm -f "$log"
  if [ -n "$cache" ]; then
    # Written aside and renamed, so that a mastering beside this one never
    # picks up half an image.
    mkdir -p "$cache"
    cp "$image" "$cache/.$key.$$" && mv -f "$cache/.$key.$$" "$cache/$key"
  fi
}

signal_name() {  # signal_name STATUS
  if [ "$1" -eq 192 ]; then echo "caught"; else kill -l "$(($1 - 128))" 2>/dev/null || echo "$1"; fi
}

# media_key IMAGE TREE PROGRAM ARGS...: the cache key of a mastering.
media_key() {
  local image=$1 tree=$2 program=$3 arg
  shift 3
  {
    for arg in "$@"; do
      [ "$arg" = "$image" ] && arg=@IMAGE@
      [ -n "$tree" ] && [ "$arg" = "$tree" ] && arg=@TREE@
      printf '%s\0' "$arg"
    done
    printf '%s\0' "$program"
    if [ -n "$tree" ]; then
      tar -C "$tree" --sort=name --mtime=@0 --owner=0 --group=0 --numeric-owner -cf - .
    fi
  } | sha256sum | cut -c1-64
}

# seed_of TREE VOLID: the tree as entries separated by \x01, each a path
# line and the file's first 64 KiB ("@volume" names the volume identifier).
seed_of() {
  local tree=$1 p
  printf '\x01@volume\n%s' "$2"
  (cd "$tree" && find . -mindepth 1 | LC_ALL=C sort) | while IFS= read -r p; do
    p=${p#./}
    if [ -d "$tree/$p" ]; then
      printf '\x01%s/\n' "$p"
    else
      printf '\x01%s\n' "$p"
      head -c 65536 "$tree/$p"
    fi
  done
}

# table OUTDIR FILE: reads "NAME | TEXT | MORE ENTRIES..." rows
# from standard input (blank lines and "#" comments skipped) and masters one
# image per row whose file FILE holds TEXT. MORE ENTRIES are
# split at blanks and passed on as they are.
table() {
  local - outdir=$1 file=$2 name text more
  set -f
  while IFS='|' read -r name text more; do
    name=$(echo $name)
    case $name in '' | '#'*) continue ;; esac
    # Columns are aligned with blanks; a blank that belongs to the text is
    # written \x20.
    text=${text#"${text%%[! ]*}"}
    text=${text%"${text##*[! ]}"}
    # shellcheck disable=SC2086
    image "$outdir" "$name" $more "$file=$text"
  done
}
