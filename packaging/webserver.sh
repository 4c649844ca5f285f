# shellcheck shell=bash
# Starting and stopping a web server of our own on 127.0.0.1; for scripts to source.

webserver_kind=lighttpd  # or nginx, apache
webserver_pid=
webserver_helper_pid=
webserver_account=www-data  # Apache's, where root starts it: it serves nothing as root
webserver_packaging=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)
webserver_pages=${webserver_packaging%/*}/apis/QELO.Share.Link/page

# webserver_start DIR PORT ENTRY PID [EXTRA]: serves ENTRY as /webapi/entry.cgi, and the rest.cgi
# beside it as /webapi/rest, and the page of sharing links, with configuration and logs in DIR; PID is
# the file for its process id, EXTRA one of further configuration. The server ends with this shell, however that ends. Says why when it cannot start.
webserver_start() {
  local dir=$1 port=$2 entry=$3 pid=$4 extra=${5:-} tries command=()
  mkdir -p "$dir/www" "$dir/uploads"
  webserver_check_port "$port" || return 1
  if [[ $webserver_kind == apache ]]; then
    webserver_lend "$dir" "$entry" || return 1
    entry=$dir/entry.cgi
  fi
  webserver_configure "$dir" "$port" "$entry" "$pid" "$extra"
  case $webserver_kind in
    lighttpd) command=(/usr/sbin/lighttpd -D -f "$dir/lighttpd.conf") ;;
    nginx)
      webserver_start_fcgiwrap "$dir" "$entry" || return 1
      command=(/usr/sbin/nginx -e "$dir/error.log" -c "$dir/nginx.conf" -g "daemon off;$(webserver_as_root 'user root;')")
      ;;
    apache)
      command=(/usr/sbin/apache2 -D FOREGROUND -D CGID -f "$dir/apache2.conf")
      [[ $(id -u) -ne 0 ]] || command+=(-C "User $webserver_account" -C "Group $webserver_account")
      ;;
  esac
  setpriv --pdeathsig TERM "${command[@]}" 2> "$dir/start.log" &
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

# webserver_as_root TEXT: the text when we are root, else nothing.
webserver_as_root() {
  [[ $(id -u) -ne 0 ]] || printf ' %s' "$1"
}

# webserver_lend DIR ENTRY: lets Apache's account start ENTRY, and the rest.cgi beside it, as root from
# DIR.
webserver_lend() {
  local dir=$1 entry=$2
  install -m 0755 "$entry" "${entry%/*}/rest.cgi" "$dir"
  [[ $(id -u) -eq 0 ]] || return 0
  chgrp "$webserver_account" "$dir/entry.cgi" "$dir/rest.cgi"
  chmod 4750 "$dir/entry.cgi" "$dir/rest.cgi"
  if ! setpriv --reuid "$webserver_account" --regid "$webserver_account" --clear-groups \
      test -x "$dir/entry.cgi"; then
    echo "Apache runs as $webserver_account, which may not enter $dir; choose another server." >&2
    return 1
  fi
}

# webserver_start_fcgiwrap DIR ENTRY: starts what starts programs for nginx.
webserver_start_fcgiwrap() {
  local dir=$1 entry=$2 tries
  rm -f "$dir/fcgiwrap.sock"
  # A group of its own, since it leaves its processes behind.
  setsid setpriv --pdeathsig TERM /usr/sbin/fcgiwrap -f -c 8 -p "$entry" -p "${entry%/*}/rest.cgi" \
    -s "unix:$dir/fcgiwrap.sock" \
    >> "$dir/cgi.log" 2>&1 &
  webserver_helper_pid=$!
  for ((tries = 0; tries < 100; tries++)); do
    [[ ! -S $dir/fcgiwrap.sock ]] || return 0
    sleep 0.05
  done
  echo "fcgiwrap did not start:" >&2
  cat "$dir/cgi.log" >&2
  webserver_stop
  return 1
}

# webserver_configure DIR PORT ENTRY PID EXTRA: writes DIR/lighttpd.conf, nginx.conf or apache2.conf.
webserver_configure() {
  local dir=$1 port=$2 entry=$3 pid=$4 extra=$5 name=$webserver_kind
  [[ $name != apache ]] || name=apache2
  sed -e "s|@DIR@|$dir|g; s|@PORT@|$port|g; s|@ENTRY@|$entry|g; s|@REST@|${entry%/*}/rest.cgi|g; s|@PID@|$pid|g; s|@PAGES@|$webserver_pages|g" \
    "$webserver_packaging/$name.conf.in" > "$dir/$name.conf"
  [[ -n $extra ]] || return 0
  if [[ $webserver_kind == nginx ]]; then  # into its server
    sed -i "/^ *root /r $extra" "$dir/nginx.conf"
  else
    cat "$extra" >> "$dir/$name.conf"
  fi
}

# webserver_scgi PREFIX SOCKET [MORE]: the configuration that has PREFIX/webapi/entry.cgi and
# PREFIX/webapi/rest served by what listens at SOCKET, which is that of the recipe for the fork server,
# and PREFIX/webapi/sharing/, the page of sharing links.
# MORE, not empty: there is another such part before.
webserver_scgi() {
  local prefix=$1 socket=$2 more=${3:-} name=$webserver_kind part
  case $webserver_kind in
    lighttpd)
      part="/^server.stream/,\$p"
      if [[ -n $more ]]; then
        part="/^\\\$HTTP/,\$p"
      else
        echo 'server.modules += ("mod_scgi")'
      fi
      ;;
    nginx) part='/^ *location /,/^    }/p' ;;
    apache)
      name=apache2
      part="/^SetEnvIf/,\$p"
      [[ -n $more ]] || part="/^LoadModule \\(proxy\\|setenvif\\)/p; $part"
      ;;
  esac
  sed -n "$part" "$webserver_packaging/$name-scgi.conf.in" \
    | sed "s|/webapi/|$prefix/webapi/|g; s|@SOCKET@|$socket|g; s|@PAGES@|$webserver_pages|g"
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
  [[ $process =~ ^[1-9][0-9]*$ && $(cat "/proc/$process/comm" 2> /dev/null) =~ ^(lighttpd|nginx|apache2)$ ]]
}

webserver_stop() {
  if [[ -n $webserver_pid ]]; then
    kill -TERM "$webserver_pid" 2> /dev/null || true
    wait "$webserver_pid" 2> /dev/null || true
    webserver_pid=
  fi
  if [[ -n $webserver_helper_pid ]]; then
    kill -TERM -- "-$webserver_helper_pid" 2> /dev/null || true
    wait "$webserver_helper_pid" 2> /dev/null || true
    webserver_helper_pid=
  fi
}
