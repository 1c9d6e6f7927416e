#!/usr/bin/env bash
# Plants small faults in a scratch copy of the checkout (the launcher and the runtime's maker), one at
# a time, and runs the rows of the scenario table, or the host tests, that can reach each; prints
# "N of N caught" (tests/table/faults.py lists them).
# In a network namespace of its own where root may, as the table always runs: port 6152 is machine-wide.
#   tools/planted-faults.sh [NAME-PART...]
cd "$(dirname "$0")/.." || exit 2
if unshare -n true 2>/dev/null; then
  exec unshare -n sh -c 'ip link set lo up; exec /usr/bin/python3 tests/table/faults.py "$@"' sh "$@"
fi
exec /usr/bin/python3 tests/table/faults.py "$@"
