# shellcheck shell=bash
# Completes webapi: its commands, their options and files; those of "call" as of webapi-exec.

_webapi() {
  local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
  local command=${COMP_WORDS[1]} words=""
  if [[ $COMP_CWORD -eq 1 ]]; then
    mapfile -t COMPREPLY < <(compgen -W "call check diff doctor new --help" -- "$current")
    return
  fi
  case $command in
    call)
      # shellcheck source=/dev/null
      declare -F _webapi_exec > /dev/null || . "$(dirname "${BASH_SOURCE[0]}")/webapi-exec"
      _webapi_exec
      return
      ;;
    check) words="--library --no-library --timeout --no-accounts --help" ;;
    diff) words="--breaks --help" ;;
    doctor) words="--config --entry --help" ;;
    new) words="--help" ;;
  esac
  if [[ $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W "$words" -- "$current")
  elif [[ $previous != --timeout ]]; then
    compopt -o filenames 2> /dev/null
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  fi
}
complete -F _webapi webapi
