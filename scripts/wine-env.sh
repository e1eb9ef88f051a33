# Sourced by the scripts that run Windows executables: a private Wine prefix,
# no installer prompts, and one persistent wineserver so that each test
# launch costs milliseconds.
export WINEPREFIX="${WINEPREFIX:-$HOME/.cache/tarncore-wine}"
export WINEDEBUG=-all
export WINEDLLOVERRIDES="mscoree,mshtml="
export WINEARCH=win64

# Debian keeps the 64-bit loader and the server off the PATH, in
# /usr/lib/wine; other systems put them on the PATH or under /opt. The first
# executable found wins; none found is an error that names the program.
tarn_wine_find() {
  local name=$1 dir
  if command -v "$name" >/dev/null 2>&1; then
    command -v "$name"
    return 0
  fi
  for dir in /usr/lib/wine /usr/lib64/wine /usr/lib/x86_64-linux-gnu/wine \
    /opt/wine-stable/bin /opt/wine-devel/bin /opt/wine-staging/bin; do
    if [ -x "$dir/$name" ]; then
      echo "$dir/$name"
      return 0
    fi
  done
  echo "wine: cannot find '$name' (Debian: apt-get install wine64)" >&2
  return 1
}
TARN_WINE=$(tarn_wine_find wine64) || TARN_WINE=
TARN_WINESERVER=$(tarn_wine_find wineserver) || TARN_WINESERVER=

# The process id of this prefix's server, or nothing. A server runs in its
# own folder, named server-DEV-INODE after the prefix's device and inode
# numbers in hex (under a per-user folder in /tmp), so its working folder
# tells whose server it is.
tarn_wine_server_pid() {
  local dev ino dir pid
  [ -d "$WINEPREFIX" ] || return 0
  dev=$(stat -c %d "$WINEPREFIX") && ino=$(stat -c %i "$WINEPREFIX") || return 0
  dir=$(printf 'server-%x-%x' "$dev" "$ino")
  for pid in $(pgrep -u "$(id -u)" wineserver 2>/dev/null); do
    if [ "$(basename "$(readlink "/proc/$pid/cwd" 2>/dev/null)")" = "$dir" ]; then
      echo "$pid"
      return 0
    fi
  done
}

tarn_wine_start() {
  [ -n "$TARN_WINE" ] && [ -n "$TARN_WINESERVER" ] || return 1
  mkdir -p "$WINEPREFIX"
  # The persistent server starts before wineboot, so that it is this server
  # that keeps the system processes wineboot starts alive between tests
  # (a server wineboot started itself would shut down soon after).
  "$TARN_WINESERVER" -p </dev/null >/dev/null 2>&1 || true
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    "$TARN_WINE" wineboot --init </dev/null >/dev/null 2>&1 || true
  fi
  # The server detaches before it settles in its folder: look for a while.
  local pid tries=0
  pid=$(tarn_wine_server_pid)
  # A server that was just told to stop may still hold the prefix's lock, so
  # that a start in the meantime gives up: ask again every two seconds.
  while [ -z "$pid" ] && [ $tries -lt 75 ]; do
    sleep 0.2
    tries=$((tries + 1))
    if [ $((tries % 10)) -eq 0 ]; then
      "$TARN_WINESERVER" -p </dev/null >/dev/null 2>&1 || true
    fi
    pid=$(tarn_wine_server_pid)
  done
  if [ -z "$pid" ]; then
    echo "wine: the persistent server ($TARN_WINESERVER -p) did not start for $WINEPREFIX" >&2
    return 1
  fi
  echo "wine: persistent server pid $pid for $WINEPREFIX"
}
tarn_wine_stop() {
  [ -n "$TARN_WINESERVER" ] && "$TARN_WINESERVER" -k >/dev/null 2>&1 || true
}
