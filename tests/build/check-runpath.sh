#!/bin/sh
# Checks the run paths of the built binaries, and of an installation made
# into a temporary prefix: every RUNPATH/RPATH entry is relative to $ORIGIN.
# An empty entry would make the loader search the current folder, and an
# absolute one ties a binary to the machine it was built on.
#
#   check-runpath.sh BUILD_DIR
set -u
build=$1
status=0
checked=0

check_file() {
  file=$1
  entries=$(readelf -d "$file" 2>/dev/null | sed -n 's/.*(\(RUNPATH\|RPATH\)).*\[\(.*\)\]/\2/p')
  [ -n "$entries" ] || return 0
  checked=$((checked + 1))
  # Split on ':' keeping empty fields: a leading, trailing or doubled ':'
  # is an empty entry.
  rest="$entries:"
  while [ -n "$rest" ]; do
    entry=${rest%%:*}
    rest=${rest#*:}
    case $entry in
      '') echo "$file: empty run path entry in [$entries]"; status=1 ;;
      '$ORIGIN'|'$ORIGIN/'*) ;;
      *) echo "$file: run path entry '$entry' is not relative to \$ORIGIN"; status=1 ;;
    esac
  done
}

check_tree() {
  for file in $(find "$1" -type f \( -name '*.so' -o -perm -u+x \) 2>/dev/null); do
    if head -c 4 "$file" 2>/dev/null | grep -q 'ELF'; then
      check_file "$file"
    fi
  done
}

check_tree "$build/out"
check_tree "$build/tests"

prefix=$(mktemp -d "${TMPDIR:-/tmp}/smbios-runpath-XXXXXX") || exit 1
trap 'rm -rf "$prefix"' EXIT
if ! cmake --install "$build" --prefix "$prefix" >/dev/null; then
  echo "cmake --install into a temporary prefix failed"
  exit 1
fi
installed=$(find "$prefix" -type f | wc -l)
check_tree "$prefix"

if [ "$checked" -eq 0 ] || [ "$installed" -eq 0 ]; then
  echo "nothing to check: $checked binaries with a run path, $installed files installed"
  exit 1
fi
echo "$checked binaries checked, $installed files installed"
exit $status
