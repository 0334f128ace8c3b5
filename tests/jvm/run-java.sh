#!/usr/bin/env bash
# run-java.sh MODE JAVA ARGS...: runs a JVM and passes its exit code on. In checkjni mode the
# run also fails when the VM printed any warning or fatal error of its JNI checks.
set -uo pipefail
mode=$1
shift
out=$(mktemp)
trap 'rm -f "$out"' EXIT
"$@" 2>&1 | tee "$out"
rc=${PIPESTATUS[0]}
if [ "$mode" = checkjni ] && grep -Eq '^(WARNING|FATAL ERROR)|JNI local refs|in native method' "$out"; then
  echo "run-java: the JVM printed JNI check warnings (see above)" >&2
  exit 1
fi
exit "$rc"
