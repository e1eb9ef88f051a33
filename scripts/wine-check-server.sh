#!/bin/sh
# A test of the cross build: the persistent wineserver that scripts/wine-env.sh
# starts is up for this prefix while the tests run. Without it each test
# launch starts and stops a server of its own, which costs most of a second.
. "$(dirname "$0")/wine-env.sh"
pid=$(tarn_wine_server_pid)
if [ -z "$pid" ]; then
  echo "no wineserver is running for $WINEPREFIX (start it with scripts/wine-env.sh's tarn_wine_start)"
  exit 1
fi
echo "wineserver pid $pid serves $WINEPREFIX"
