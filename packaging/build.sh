# shellcheck shell=bash
# Configuring and building a tree; for scripts to source.

# show_progress: shows how much is built in one line of the terminal, from the build's own output,
# and takes the line away at the end. Without a terminal nothing.
show_progress() {
  local line shown=
  while IFS= read -r line; do
    if [[ -t 2 && $line =~ ^\[\ *([0-9]+)%\] && ${BASH_REMATCH[1]} != "$shown" ]]; then
      shown=${BASH_REMATCH[1]}
      printf '\rBuilding: %3d %%' "$shown" >&2
    fi
  done
  [[ -z $shown ]] || printf '\r\033[K' >&2
}

# build_tree DIR [CMAKE-OPTION...]: builds BUILD_TARGET, or all, into DIR with DIR/root as the
# private root. Quiet unless it fails, but for the progress on a terminal.
build_tree() {
  local dir=$1
  shift
  if [[ -e $dir && ! -w $dir ]] || ! mkdir -p "$dir" 2> /dev/null; then
    echo "$dir cannot be written; was it built by another user? Remove it and try again." >&2
    return 1
  fi
  if ! cmake -S . -B "$dir" -DWEBAPI_ROOT_PREFIX="$dir/root" "$@" > "$dir/configure.log" 2>&1; then
    cat "$dir/configure.log" >&2
    return 1
  fi
  # Not in the background, where Ctrl-C would not reach it.
  if ! (set -o pipefail
        cmake --build "$dir" --target "${BUILD_TARGET:-all}" -j "$(nproc)" 2>&1 | tee "$dir/build.log" | show_progress); then
    grep -E 'error|Error|undefined' -A 3 "$dir/build.log" | head -n 60 >&2
    echo "The build failed; the whole log is $dir/build.log" >&2
    return 1
  fi
}
