#!/usr/bin/env bash
# Fails when tarn/TarnCore.h does not include every public header
# (private *Impl.h headers excepted).
set -euo pipefail
cd "$(dirname "$0")/.."
missing=0
for h in $(git ls-files -co --exclude-standard 'tarn/*.h' | grep -v -E 'Impl\.h$|^tarn/TarnCore\.h$'); do
  if ! grep -q "#include \"$h\"" tarn/TarnCore.h; then
    echo "tarn/TarnCore.h does not include $h"
    missing=1
  fi
done
exit $missing
