#!/usr/bin/env bash
# check-exports.sh LIB: the library exports every function and table that other code links
# against, each table with its exact size, and none of its own internals.
set -uo pipefail
symbols=$(${NM:-nm} -D --defined-only -S -C "$1") || exit 1
fail=0
functions=("JNI_OnLoad" "JNIDVBListener::JNIDVBListener(_JNIEnv*, _jobject*, _jobject*)"
  "JNIDVBListener::~JNIDVBListener()" "JNIDVBListener::notify(int, int, int, android::Parcel const*)"
  "Scnmnotify(int, int, int)" "Strmcallback(void*, int, int)" "Subttlcallback(void*, int, int)"
  "YCC2RGB_A(unsigned char, unsigned char)" "register_android_dvb_"{Scnm,Strm,Cfg,Subttl,Teltxt}"(_JNIEnv*)"
  "YCC2RGB_"{R,G,B}"(unsigned char, unsigned char, unsigned char)")
for f in "${functions[@]}"; do grep -qF -- " T $f" <<<"$symbols" || { echo "missing export: $f"; fail=1; }; done
for t in s_SvcExt:12400 s_SvcNet:19200 videoContents:64 audioContents:736 subtitleContents:224 \
  teletextContents:672 caSysId:6 EpgExtentItemNow:1536 EpgExtentItemNext:1536 Data:1930792; do
  size=$(awk -v n="${t%:*}" '$4 == n && ($3 == "B" || $3 == "D") {print $2}' <<<"$symbols")
  [ -n "$size" ] && [ $((16#$size)) -eq "${t#*:}" ] || { echo "table ${t%:*}: size '$size', not ${t#*:}"; fail=1; }
done
grep -E " dvbjni::|\(anonymous namespace\)" <<<"$symbols" && { echo "internal symbols are exported (above)"; fail=1; }
[ $fail -eq 0 ] && echo "exports: ok"
exit $fail
