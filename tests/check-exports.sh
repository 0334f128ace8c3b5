#!/usr/bin/env bash
# check-exports.sh LIB: the library exports every function and table that other code links
# against, each table with its exact size, and none of its own internals.
set -uo pipefail
lib=$1
symbols=$(${NM:-nm} -D --defined-only -S -C "$lib") || exit 1
fail=0
need() {
  grep -qF -- "$1" <<<"$symbols" || { echo "missing export: $1"; fail=1; }
}
table() {  # name, size in bytes
  local line
  line=$(awk -v n="$1" '$4 == n && ($3 == "B" || $3 == "D")' <<<"$symbols")
  if [ -z "$line" ]; then
    echo "missing table: $1"
    fail=1
  elif [ $((16#$(awk '{print $2}' <<<"$line"))) -ne "$2" ]; then
    echo "table $1 is $((16#$(awk '{print $2}' <<<"$line"))) bytes, not $2"
    fail=1
  fi
}
need " T JNI_OnLoad"
for c in Scnm Strm Cfg Subttl Teltxt; do need " T register_android_dvb_$c(_JNIEnv*)"; done
need " T JNIDVBListener::JNIDVBListener(_JNIEnv*, _jobject*, _jobject*)"
need " T JNIDVBListener::~JNIDVBListener()"
need " T JNIDVBListener::notify(int, int, int, android::Parcel const*)"
need " T Scnmnotify(int, int, int)"
need " T Strmcallback(void*, int, int)"
need " T Subttlcallback(void*, int, int)"
for c in R G B; do need " T YCC2RGB_$c(unsigned char, unsigned char, unsigned char)"; done
need " T YCC2RGB_A(unsigned char, unsigned char)"
table s_SvcExt 12400
table s_SvcNet 19200
table videoContents 64
table audioContents 736
table subtitleContents 224
table teletextContents 672
table caSysId 6
table EpgExtentItemNow 1536
table EpgExtentItemNext 1536
table Data 1930792
if grep -E " dvbjni::|\(anonymous namespace\)" <<<"$symbols"; then
  echo "internal symbols are exported (above)"
  fail=1
fi
[ $fail -eq 0 ] && echo "exports: ok"
exit $fail
