#!/bin/sh
# Builds the tool and takes documents along the whole road: read, look, change, write, read back, measure. Then an edit
# list of the sample, timecode, and a host with plug-ins.
set -eu
LC_ALL=C
export LC_ALL
here=$(cd "$(dirname "$0")" && pwd)

usage() {
  cat <<END
Usage: ./demo.sh [--windows] [FILE...]

Builds the command-line tool tavo (installing first what that takes) and shows what
the library does with the sample timeline, or with the documents given, and with
timecode.

  --windows   the same with TAVO.dll and tavo.exe, under Wine
  --help      this text

Exits with 0 when everything went well. Nothing is written outside build/.
END
}

preset=linux-release
setup=--no-windows
run=
exe=
while [ $# -gt 0 ]; do
  case $1 in
    --windows) preset=windows-release setup= run=$here/tools/wine-run exe=.exe ;;
    --help | -h) usage; exit 0 ;;
    --) shift; break ;;
    -*) echo "demo.sh: unknown option $1" >&2; usage >&2; exit 2 ;;
    *) break ;;
  esac
  shift
done

title() { printf '\n== %s\n' "$1"; }
say() { printf '   %s\n' "$1"; }
fail() { printf 'demo.sh: %s\n' "$1" >&2; exit 1; }
indent() { sed 's/^/   | /'; }
# Cuts long lines, and not inside a character.
shorten() { awk 'length($0) > 110 { $0 = substr($0, 1, 107); sub(/[\300-\377][\200-\277]*$/, ""); $0 = $0 "..." } { print }'; }
# Wine takes names and texts in the locale's encoding.
tavo() { LC_ALL=C.UTF-8 $run "$here/build/$preset/bin/tavo$exe" "$@"; }

mkdir -p "$here/build"
work=$(mktemp -d "$here/build/demo.XXXXXX")
trap 'rm -rf "$work"' EXIT
trap 'exit 1' HUP INT TERM

# Runs a step whose output matters only when it fails.
quietly() {
  "$@" > "$work/log" 2>&1 || { cat "$work/log" >&2; fail "this failed: $*"; }
}

build() {
  title "Building ($preset)"
  quietly "$here/tools/setup" $setup
  cd "$here"
  [ -e "build/$preset/build.ninja" ] || quietly cmake --preset "$preset"
  quietly cmake --build --preset "$preset" --target tavo --target example_edit_list --target example_host
  cd "$from"
  say "build/$preset/bin/tavo$exe, linked with the shared library beside it"
  tavo about | indent
}

# A path that leads to a text: names of which each is the first of its kind, down to an element without children.
text_path() {
  awk '
    function choose() { if (candidate != "" && chosen == "") chosen = candidate; candidate = "" }
    /^ *\(/ { next }
    {
      match($0, /^ */); depth = RLENGTH / 2
      line = substr($0, RLENGTH + 1)
      gsub(/ [^ ="]+="([^"\\]|\\.)*"/, "", line)
      name = line; sub(/: ".*/, "", name)
      if (depth > held) candidate = ""; else choose()
      held = depth
      if (depth == 0) next
      path = depth == 1 ? name : at[depth - 1] "/" name
      first[depth] = (depth == 1 || first[depth - 1]) && !(path in seen)
      if (first[depth]) seen[path] = 1
      at[depth] = path
      if (first[depth] && line ~ /: "/) candidate = path
    }
    END { choose(); print chosen }' "$1"
}

# Writes a document and compares what is read back. Texts that the library does not keep are told by the tool itself.
write_and_compare() { # source, outline, encoding
  out=$work/$3.xml
  tavo xml format "$1" -o "$out" --encoding "$3" --pretty 2> "$work/notes" || { cat "$work/notes" >&2; fail "cannot write $3"; }
  tavo xml tree "$out" > "$work/again.txt"
  bytes=$(wc -c < "$out")
  if cmp -s "$2" "$work/again.txt"; then
    say "$3: $((bytes)) bytes; read back, the tree is the same"
  elif grep -q 'read back differently\|reads back differently' "$work/notes"; then
    say "$3: $((bytes)) bytes; read back, the tree differs as the tool said:"
    grep 'differently' "$work/notes" | indent
  else
    fail "$1: the tree differs after writing as $3"
  fi
}

road() { # document
  title "Checking $1"
  tavo xml check "$1" 2> "$work/notes" > "$work/checked" || { indent < "$work/checked"; cat "$work/notes" >&2; fail "this document cannot be read"; }
  indent < "$work/checked"
  indent < "$work/notes"

  title "Its tree"
  tavo xml tree "$1" > "$work/tree.txt"
  head -n 12 "$work/tree.txt" | shorten | indent
  lines=$(wc -l < "$work/tree.txt")
  say "$((lines)) elements in all"

  path=$(text_path "$work/tree.txt")
  if [ -n "$path" ]; then
    title "Finding the text at $path, and changing it"
    set -- "$1" "$path"
  else
    title "No text to find; adding an attribute to the root"
    set -- "$1" . --attribute touched
  fi
  if [ $# = 2 ]; then say "it is:  $(tavo xml get "$@")"; fi
  source=$1
  shift
  tavo xml set "$source" "$@" 'changed: ñ λ я 字' -o "$work/changed.xml" 2> "$work/notes" ||
    { cat "$work/notes" >&2; fail "cannot change it"; }
  grep 'differently' "$work/notes" | indent || true
  now=$(tavo xml get "$work/changed.xml" "$@")
  say "now it is:  $now"
  [ "$now" = 'changed: ñ λ я 字' ] || fail "the change was lost"

  title "Writing it as UTF-8 and as UTF-16, and reading it back"
  tavo xml tree "$work/changed.xml" > "$work/changed.txt"
  write_and_compare "$work/changed.xml" "$work/changed.txt" utf-8
  write_and_compare "$work/changed.xml" "$work/changed.txt" utf-16

  title "Memory and speed"
  tavo xml stat "$source" | indent

  title "The pool of strings, before, with and after the document"
  tavo pool stat "$source" | indent
}

timecode() {
  title "An edit list of the sample timeline's clips, and how long they last in each system"
  say "event, source in and out, record in and out, clip; the separators tell the system"
  LC_ALL=C.UTF-8 $run "$here/build/$preset/bin/example_edit_list$exe" "$here/examples/data/timeline.xml" > "$work/edits.txt" ||
    { cat "$work/edits.txt" >&2; fail "the edit list does not add up"; }
  head -n 5 "$work/edits.txt" | tr -d '\r' | indent
  say "..."
  tail -n 8 "$work/edits.txt" | tr -d '\r' | indent

  title "Timecode: drop frame skips two labels where minute 1 begins"
  tavo tc table --system 'NTSC(DF)' --frames 2 | indent
  say "and one hour of that label is this in PAL, in real time:"
  tavo tc convert 01.00:00.00 --to PAL --retime | indent
}

components() {
  title "A host that loads plug-ins, uses their components, and keeps one while an object of it lives"
  LC_ALL=C.UTF-8 $run "$here/build/$preset/bin/example_host$exe" "$here/build/$preset/bin/plugins" \
    "$here/examples/data/timeline.xml" > "$work/host.txt" || { cat "$work/host.txt" >&2; fail "the host found a fault"; }
  tr -d '\r' < "$work/host.txt" | indent
}

from=$(pwd)
build
[ $# -gt 0 ] || set -- "$here/examples/data/timeline.xml"
count=$#
for document in "$@"; do road "$document"; done
timecode
components
title "Done: $count $([ "$count" = 1 ] && echo document || echo documents), all as expected"
