# shellcheck shell=bash
# Starting and stopping a lighttpd of our own on 127.0.0.1; for scripts to source.

webserver_pid=

# webserver_start DIR PORT ENTRY PID [EXTRA]: serves ENTRY as /webapi/entry.cgi, with configuration
# and logs in DIR; PID is the file for its process id, EXTRA one of further configuration. The
# server ends with this shell, however that ends. Says why when it cannot start.
webserver_start() {
  local dir=$1 port=$2 entry=$3 pid=$4 extra=${5:-} tries
  mkdir -p "$dir/www" "$dir/uploads"
  sed -e "s|@DIR@|$dir|g; s|@PORT@|$port|g; s|@ENTRY@|$entry|g; s|@PID@|$pid|g" \
    "$(dirname "${BASH_SOURCE[0]}")/lighttpd.conf.in" > "$dir/lighttpd.conf"
  [[ -z $extra ]] || cat "$extra" >> "$dir/lighttpd.conf"
  webserver_check_port "$port" || return 1
  setpriv --pdeathsig TERM /usr/sbin/lighttpd -D -f "$dir/lighttpd.conf" 2> "$dir/start.log" &
  webserver_pid=$!
  for ((tries = 0; tries < 100; tries++)); do
    webserver_port_is_taken "$port" && return 0
    kill -0 "$webserver_pid" 2> /dev/null || break
    sleep 0.05
  done
  echo "The web server did not start:" >&2
  cat "$dir/start.log" "$dir/error.log" >&2 2> /dev/null
  webserver_stop
  return 1
}

webserver_port_is_taken() {
  (: > "/dev/tcp/127.0.0.1/$1") 2> /dev/null
}

# webserver_check_port PORT: fails, and says so, when it is taken.
webserver_check_port() {
  if webserver_port_is_taken "$1"; then
    echo "Port $1 of 127.0.0.1 is taken by another program; choose one with --port." >&2
    return 1
  fi
}

# webserver_is_running PID: whether a web server runs whose process id is in this file.
webserver_is_running() {
  local process=
  [[ -s $1 ]] && read -r process < "$1"
  [[ $process =~ ^[1-9][0-9]*$ && $(cat "/proc/$process/comm" 2> /dev/null) == lighttpd ]]
}

webserver_stop() {
  [[ -n $webserver_pid ]] || return 0
  kill -TERM "$webserver_pid" 2> /dev/null || true
  wait "$webserver_pid" 2> /dev/null || true
  webserver_pid=
}
