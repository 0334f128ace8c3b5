#!/usr/bin/env bash
# make-variant.sh JAVAC SRC_DIR OUT_DIR MODE: compiles the API classes into OUT_DIR with one
# alteration, so that a load-failure check can run on them.
set -euo pipefail
javac=$1 src=$2 out=$3 mode=$4
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
cp "$src"/*.java "$tmp"/
rename_context() { sed -i 's/\bmNativeContext\b/mOtherContext/g' "$tmp/$1.java"; }
case $mode in
  ok | no-scnm-class | no-cfg-class | no-subttl-class) ;;
  no-scnm-field) rename_context Scnm ;;
  no-strm-field) rename_context Strm ;;
  no-cfg-field) rename_context Cfg ;;
  no-teltxt-field) rename_context Teltxt ;;
  no-dvb-field) rename_context DVB ;;
  no-post-event) sed -i 's/\bpostEventFromNative\b/postEventRenamed/g' "$tmp/DVB.java" ;;
  no-fields)  # every field of every record class renamed
    sed -i -E 's/^(        public (int|long|String|byte\[\]|int\[\]) )([A-Za-z_0-9]+);/\1gone_\3;/' \
      "$tmp"/{Scnm,Strm,Cfg,Subttl,Teltxt}.java ;;
  *) echo "unknown variant $mode" >&2; exit 1 ;;
esac
rm -rf "$out"
mkdir -p "$out"
"$javac" --release 8 -nowarn -d "$out" "$tmp"/*.java
case $mode in
  no-scnm-class) rm -f "$out"/android/DVB/Scnm.class "$out"/android/DVB/Scnm\$*.class ;;
  no-cfg-class) rm -f "$out"/android/DVB/Cfg.class "$out"/android/DVB/Cfg\$*.class ;;
  no-subttl-class) rm -f "$out"/android/DVB/Subttl.class "$out"/android/DVB/Subttl\$*.class ;;
esac
