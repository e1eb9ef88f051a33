# Sourced by the scripts that run Windows executables: a private Wine prefix,
# no installer prompts, and one persistent wineserver so that each test
# launch costs milliseconds.
export WINEPREFIX="${WINEPREFIX:-$HOME/.cache/tarncore-wine}"
export WINEDEBUG=-all
export WINEDLLOVERRIDES="mscoree,mshtml="
export WINEARCH=win64
tarn_wine_start() {
  mkdir -p "$WINEPREFIX"
  # The persistent server starts first, detached from our output, so that
  # the system processes it and wineboot start (services, devices, desktop)
  # never hold a test's output pipe open: CTest waits for that pipe to close.
  wineserver -p </dev/null >/dev/null 2>&1 || true
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    /usr/lib/wine/wine64 wineboot --init </dev/null >/dev/null 2>&1 || true
  fi
  # One throwaway process brings up the on-demand services the same way.
  /usr/lib/wine/wine64 cmd /c exit </dev/null >/dev/null 2>&1 || true
}
tarn_wine_stop() {
  wineserver -k >/dev/null 2>&1 || true
}
