#!/usr/bin/env bash
# make-variant.sh JAVAC SRC_DIR OUT_DIR MODE: compiles the API classes into OUT_DIR with one
# alteration, so that a load-failure check can run on them. A mode no-X-class or no-X-field
# names the API class X in lower case.
set -euo pipefail
javac=$1 src=$2 out=$3 mode=$4
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
cp "$src"/*.java "$tmp"/
cls=${mode#no-}
cls=${cls%-*}
[ "$cls" = dvb ] && cls=DVB || cls=${cls^}
case $mode in
  ok | no-*-class) ;;
  no-*-field) sed -i 's/\bmNativeContext\b/mOtherContext/g' "$tmp/$cls.java" ;;
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
  no-*-class) rm -f "$out/android/DVB/$cls.class" "$out/android/DVB/$cls"\$*.class ;;
esac
