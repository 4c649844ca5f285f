# shellcheck shell=bash
# Configuring and building a tree; for scripts to source.

# build_tree DIR [CMAKE-OPTION...]: builds into DIR with DIR/root as the private root. Quiet unless
# something is built or fails.
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
  if ! cmake --build "$dir" -j "$(nproc)" > "$dir/build.log" 2>&1; then
    grep -E 'error|Error|undefined' -A 3 "$dir/build.log" | head -n 60 >&2
    echo "The build failed; the whole log is $dir/build.log" >&2
    return 1
  fi
}
