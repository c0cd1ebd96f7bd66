#!/bin/sh
# Runs sessionmgr.exe as an engineer would and checks its output and exit status.
# Arguments: the wine-exec wrapper, the tool, a scratch folder, the external-process test client.
wine_exec="$1"; tool="$2"; out="$3"; client="$4"
mkdir -p "$out"
fails=0

# run NAME EXPECTED-STATUS ARGS...: output in $out/NAME.out and $out/NAME.err (Wine writes CRLF).
run() {
  name="$1"; expected="$2"; shift 2
  "$wine_exec" "$tool" "$@" >"$out/$name.raw" 2>"$out/$name.rawerr"
  status=$?
  tr -d '\r' <"$out/$name.raw" >"$out/$name.out"
  tr -d '\r' <"$out/$name.rawerr" | grep -v '^[0-9a-f]*:fixme:' >"$out/$name.err"
  if [ "$status" != "$expected" ]; then
    echo "FAIL $name: exit status $status, expected $expected"; cat "$out/$name.out" "$out/$name.err"; fails=$((fails + 1))
  fi
}

expect() {  # expect NAME FILE-SUFFIX TEXT: the output holds the line or text
  if ! grep -qF -- "$3" "$out/$1.$2"; then
    echo "FAIL $1: '$3' not in its $2:"; cat "$out/$1.$2"; fails=$((fails + 1))
  fi
}

run help 0 --help
expect help out "open NAME [--options TEXT]"

# A session opens, tells its category and handles; a custom session serves no handle.
run open 0 open CUSTOM::Bench
expect open out "Category: CUSTOM"
expect open out "Lock: unlocked"
expect open out "  IODriver: (not offered by this session)"
expect open out "   Name: Bench, Category: CUSTOM"

# A name that does not resolve: the manager's own code and message, on stderr, exit 1.
run unresolved 1 open "VXIPNP::NoSuchInstrument"
expect unresolved err "sessionmgr: error -17304: 'VXIPNP::NoSuchInstrument' is not a driver session name"
run unresolved-json 1 open "VXIPNP::NoSuchInstrument" --json
expect unresolved-json err '{"error":-17304,"message":"'"'"'VXIPNP::NoSuchInstrument'"'"' is not a driver session name"}'

run categories 0 categories --json
expect categories out '"CUSTOM"'

# A session of the shared external process, locked by another program: the tool sees the lock, is
# refused it, and breaks it.
"$wine_exec" "$client" "get=*CUSTOM::ToolLock" "lock=Holder:5" "wait=ToolDone" >"$out/holder.txt" 2>&1 &
holder=$!
seen=0
for attempt in $(seq 1 60); do
  run sessions-external 0 sessions "*"
  if grep -qF "*CUSTOM::ToolLock  (locked by 'Holder', level 1)" "$out/sessions-external.out"; then seen=1; break; fi
  sleep 1
done
[ "$seen" = 1 ] || { echo "FAIL the holder's lock never showed:"; cat "$out/sessions-external.out" "$out/holder.txt"; fails=$((fails + 1)); }
run refused 1 lock "*CUSTOM::ToolLock" --key Other --timeout 0
expect refused err "sessionmgr: error -17402"
run broken 0 unlock "*CUSTOM::ToolLock" --all
expect broken out "*CUSTOM::ToolLock: unlocked"
"$wine_exec" "$client" "signal=ToolDone" >"$out/release.txt" 2>&1
wait "$holder"

echo "fails=$fails"
[ "$fails" = 0 ]
