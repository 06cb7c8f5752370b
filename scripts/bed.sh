# A bed for the whole system, to be sourced: a private session bus, the sandbox service and the daemon, all in a temporary
# directory on loopback, gone when the script ends.
#
#   ZK_BUILD   the build directory whose programs are used
#
#   bed_open           directories, bus and service; the environment then points everything there
#   bed_daemon ARG...  starts the daemon, with at most BED_DESCRIPTORS descriptors if set, and waits until it answers
#   bed_daemon_stop    SIGTERM; its status is the function's
#   bed_close          ends everything; runs by itself at the script's end

bed_root=$(dirname "${BASH_SOURCE[0]}")/..
zelkord=${ZK_ZELKORD_BINARY:-${ZK_BUILD:-$bed_root/build/release}/zelkord/core/zelkord}
zelkorctl=${ZK_ZELKORCTL_BINARY:-${ZK_BUILD:-$bed_root/build/release}/zelkorctl/zelkorctl}
sandbox=${ZK_ZELKOR_SANDBOX_BINARY:-${ZK_BUILD:-$bed_root/build/release}/sandbox/zelkor-sandbox}

bed_fail() {
  echo "FAILED: $*" >&2
  [ -z "${BED_LOG:-}" ] || tail -n 20 "$BED_LOG" >&2
  exit 1
}

# bed_wait WHAT COMMAND...: until the command succeeds, at most 60 s.
bed_wait() {
  local what=$1 tries=0
  shift
  until "$@" >/dev/null 2>&1; do
    tries=$((tries + 1))
    [ $tries -lt 600 ] || bed_fail "$what did not happen within a minute"
    sleep 0.1
  done
}

bed_open() {
  BED=$(mktemp -d)
  BED_PIDS=()
  BED_LOG=$BED/zelkord.log
  trap bed_close EXIT
  export XDG_CACHE_HOME=$BED/cache XDG_STATE_HOME=$BED/state XDG_CONFIG_HOME=$BED/config XDG_DATA_HOME=$BED/data
  export XDG_RUNTIME_DIR=$BED/run XDG_CONFIG_DIRS=$BED/etc LC_ALL=C.UTF-8
  mkdir -p "$BED"/{cache,state,config,data,etc/com.quenta.zelkord,config/com.quenta.zelkord}
  mkdir -m 700 "$BED/run"
  bed_bus
  bed_service
}

bed_bus() {
  cat >"$BED/bus.conf" <<XML
<busconfig>
  <type>session</type>
  <listen>unix:path=$BED/run/bus</listen>
  <auth>EXTERNAL</auth>
  <policy context="default">
    <allow send_destination="*" eavesdrop="true"/>
    <allow eavesdrop="true"/>
    <allow own="*"/>
  </policy>
</busconfig>
XML
  dbus-daemon --config-file="$BED/bus.conf" --nofork --nopidfile 2>"$BED/bus.log" &
  BED_PIDS+=($!)
  export DBUS_SESSION_BUS_ADDRESS=unix:path=$BED/run/bus
  bed_wait "the session bus" test -S "$BED/run/bus"
}

bed_service() {
  "$sandbox" --state "${BED_SANDBOX_STATE:-$BED/sandbox}" --port-file "$BED/sandbox.url" --quiet &
  BED_PIDS+=($!)
  bed_wait "the service" test -s "$BED/sandbox.url"
  BED_URL=$(cat "$BED/sandbox.url")
  export SSL_CERT_FILE=${BED_SANDBOX_STATE:-$BED/sandbox}/cert.pem
  printf '{"ZLKBagURL": "%s/bag"}\n' "$BED_URL" >"$BED/etc/com.quenta.zelkord/defaults.json"
}

# bed_ask PATH...: the service's control, for instance what it received.
bed_ask() { curl --silent --show-error --fail --cacert "$SSL_CERT_FILE" "$BED_URL/control/$1" "${@:2}"; }

bed_daemon() {
  (
    [ -z "${BED_DESCRIPTORS:-}" ] || ulimit -n "$BED_DESCRIPTORS"
    exec "$zelkord" --log-file "$BED_LOG" --log-level debug "$@"
  ) &
  BED_DAEMON=$!
  BED_PIDS+=("$BED_DAEMON")
  bed_wait "the daemon" "$zelkorctl" --socket "$BED/run/com.quenta.zelkord/socket" status
}

bed_daemon_stop() {
  kill -TERM "$BED_DAEMON"
  wait "$BED_DAEMON"
}

bed_close() {
  local pid
  for pid in "${BED_PIDS[@]}"; do kill "$pid" 2>/dev/null || true; done
  wait 2>/dev/null || true
  rm -rf "$BED"
}
