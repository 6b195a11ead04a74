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
  # The mastering tool's chatter is kept aside and shown only when it fails,
  # so that a failure under `set -e` never goes unexplained.
  local rc=0 log
  log=$(mktemp)
  case $mode in
    rr) xorriso -as mkisofs -R -J -quiet -no-pad -V "$volid" -o "$outdir/$name.iso" "$tree" \
          2>"$log" || rc=$? ;;
    plain) xorriso -as mkisofs -quiet -no-pad -V "$volid" -o "$outdir/$name.iso" "$tree" \
          2>"$log" || rc=$? ;;
    udf) genisoimage -quiet -udf -R -J -V "$volid" -o "$outdir/$name.iso" "$tree" \
          2>"$log" || rc=$? ;;
  esac
  rm -rf "$tree"
  if [ $rc -ne 0 ]; then
    echo "image: mastering $name failed (exit $rc):" >&2
    cat "$log" >&2
  fi
  rm -f "$log"
  return $rc
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
