# Sourced by the scripts that run Windows executables: a private Wine prefix,
# no installer prompts, and one persistent wineserver so that each test
# launch costs milliseconds.
export WINEPREFIX="${WINEPREFIX:-$HOME/.cache/tarncore-wine}"
export WINEDEBUG=-all
export WINEDLLOVERRIDES="mscoree,mshtml="
export WINEARCH=win64
tarn_wine_start() {
  mkdir -p "$WINEPREFIX"
  # The persistent server starts before wineboot, so that it is this server
  # that keeps the system processes wineboot starts alive between tests
  # (a server wineboot started itself would shut down soon after).
  wineserver -p </dev/null >/dev/null 2>&1 || true
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    /usr/lib/wine/wine64 wineboot --init </dev/null >/dev/null 2>&1 || true
  fi
}
tarn_wine_stop() {
  wineserver -k >/dev/null 2>&1 || true
}
