# Sourced by the scripts that run Windows executables: a private Wine prefix,
# no installer prompts, and one persistent wineserver so that each test
# launch costs milliseconds.
export WINEPREFIX="${WINEPREFIX:-$HOME/.cache/tarncore-wine}"
export WINEDEBUG=-all
export WINEDLLOVERRIDES="mscoree,mshtml="
export WINEARCH=win64
tarn_wine_start() {
  mkdir -p "$WINEPREFIX"
  if [ ! -f "$WINEPREFIX/system.reg" ]; then
    /usr/lib/wine/wine64 wineboot --init >/dev/null 2>&1 || true
  fi
  wineserver -p >/dev/null 2>&1 || true
}
tarn_wine_stop() {
  wineserver -k >/dev/null 2>&1 || true
}
