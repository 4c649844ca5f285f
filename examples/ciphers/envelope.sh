#!/bin/bash
# Enciphers a parameter line for the web API by the openssl command alone; docs/ciphers.md tells what
# an envelope is. Writes it to standard output.
#
#   envelope.sh host PUBLIC-KEY-FILE 'a=1&b=2'     the value of __cIpHeRtExT
#   envelope.sh token ACCESS-TOKEN 'a=1&b=2'       the value of __tXeTrEhPiC
#
# SECONDS_NOW overrides the clock. Keys stand on openssl's command line, where other users of this
# machine may see them: a program uses a library instead.
set -euo pipefail

base64url() { openssl base64 -A | tr '+/' '-_' | tr -d '='; }
hex() { od -An -v -tx1 | tr -d ' \n'; }
# shellcheck disable=SC2001  # a pattern of the shell's cannot repeat what it found
bytes() { printf '%b' "$(sed 's/../\\x&/g' <<< "$1")"; }
derive() { openssl kdf -binary -keylen "$4" -kdfopt "digest:$1" -kdfopt "hexkey:$2" -kdfopt "info:$3" HKDF; }

# seal ALGORITHM ENCIPHERED-KEY KEY LINE: A256CBC-HS512; the keys in hexadecimal digits
seal() {
  local header iv text tag
  header=$(printf '{"alg":"%s","enc":"A256CBC-HS512","iat":%d}' "$1" "${SECONDS_NOW:-$(date +%s)}" | base64url)
  iv=$(openssl rand -hex 16)
  text=$(printf '%s' "$4" | openssl enc -aes-256-cbc -K "${3:64}" -iv "$iv" | hex)
  tag=$( { printf '%s' "$header"; bytes "$iv$text$(printf '%016x' $((${#header} * 8)))"; } |
    openssl dgst -sha512 -mac HMAC -macopt "hexkey:${3:0:64}" -binary | head -c 32 | base64url)
  printf '%s.%s.%s.%s.%s\n' "$header" "$(bytes "$2" | base64url)" "$(bytes "$iv" | base64url)" \
    "$(bytes "$text" | base64url)" "$tag"
}

[[ $# -eq 3 ]] || { sed -n '5,6s/^#//p' "$0" >&2; exit 2; }
case $1 in
  host)
    key=$(openssl rand -hex 64)
    enciphered=$(bytes "$key" | openssl pkeyutl -encrypt -pubin -inkey "$2" -pkeyopt rsa_padding_mode:oaep \
      -pkeyopt rsa_oaep_md:sha256 -pkeyopt rsa_mgf1_md:sha256 | hex)
    seal RSA-OAEP-256 "$enciphered" "$key" "$3"
    ;;
  token)
    hash=$(printf '%s' "$2" | openssl dgst -sha256 -binary | hex)
    text=$(derive SHA256 "$hash" 'webapi parameter key' 24 | base64url | hex)
    seal dir '' "$(derive SHA512 "$text" 'webapi parameter cipher' 64 | hex)" "$3"
    ;;
  *) echo "envelope.sh: host or token" >&2 && exit 2 ;;
esac
