# shellcheck shell=bash
# Completes webapi-exec: its options, the names of APIs and methods, users and files.

_webapi_exec() {
  local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  local options="--api --method --version --user --param --json --upload --output --batch"
  options+=" --follow --task --list --help"
  local words="" api="" i program=("${COMP_WORDS[0]}")
  [[ ${COMP_WORDS[1]} != call ]] || program+=(call)
  case $previous in
    --api) words=$("${program[@]}" --list 2> /dev/null) ;;
    --method)
      for ((i = 1; i < COMP_CWORD; i++)); do
        [[ ${COMP_WORDS[i]} == --api ]] && api=${COMP_WORDS[i + 1]}
      done
      [[ -n $api ]] && words=$("${program[@]}" --list --api "$api" 2> /dev/null)
      ;;
    --user)
      mapfile -t COMPREPLY < <(compgen -u -- "$current")
      return
      ;;
    --json | --output | --batch)
      compopt -o filenames 2> /dev/null
      mapfile -t COMPREPLY < <(compgen -f -- "$current")
      return
      ;;
    --version | --param | --upload | --task) return ;;
    *) words=$options ;;
  esac
  mapfile -t COMPREPLY < <(compgen -W "$words" -- "$current")
}
complete -F _webapi_exec webapi-exec
