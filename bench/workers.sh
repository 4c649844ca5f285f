# shellcheck shell=bash disable=SC2154
# What workers cost; for bench/run to source.

# A call by a worker, against the same one by entry.cgi; and the processor time of web server, server,
# fronts and workers for each.
check "$worker_url?$worker_query"
for ((slice = 0; slice < slices; slice++)); do
  printf '%s %s\n' "$(rate "$worker_url?$worker_query" 1)" "$(rate "$url?$worker_query" 1)"
done | compare worker.requests worker.cgi.requests worker.ratio 1/s
# processor_ticks: what the web server and the server with workers have used, in ticks of the clock; what
# processes used that have ended since is their parent's by then.
processor_ticks() {
  local pid
  for pid in "$webserver_pid" "$worker_server" $(pgrep -P "$worker_server"); do
    [[ ! -r /proc/$pid/stat ]] || sed 's/.*) //' "/proc/$pid/stat"
  done | awk '{ ticks += $12 + $13 + $14 + $15 } END { print ticks }'
}
ticks_before=$(processor_ticks)
calls=$(wrk -t1 -c4 -d$((slices + 1))s "$worker_url?$worker_query" | sed -n 's/^ *\([0-9]*\) requests in.*/\1/p')
ticks=$(($(processor_ticks) - ticks_before))
awk -v ticks="$ticks" -v calls="$calls" -v hertz="$(getconf CLK_TCK)" \
  'BEGIN { printf "worker.cpu.us %.0f us\n", ticks * 1000000 / hertz / calls }'
check "$worker_url?$worker_query"
