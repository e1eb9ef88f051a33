#!/bin/sh
# Runs one Windows executable under Wine for CTest (the cross build's
# emulator). The program's output goes to a file first and is printed when it
# exits: any Wine system process started along the way inherits that file
# instead of CTest's pipe, so it cannot keep the test open after the program
# has finished.
. "$(dirname "$0")/wine-env.sh"
[ -n "$TARN_WINE" ] || exit 127
out=$(mktemp)
"$TARN_WINE" "$@" >"$out" 2>&1
rc=$?
cat "$out"
rm -f "$out"
exit $rc
