#!/usr/bin/env bash
# count.sh BUILD_DIR: instructions per call of each twin and its library method, counted by
# callgrind over the whole call (the VM's work included). Unlike wall time on a shared machine,
# the count repeats exactly. Prints a Markdown table.
set -euo pipefail
build=$1
calls=3000
out=$(mktemp)
trap 'rm -f "$out"' EXIT
toggles=()
for m in Cfg_Tune Cfg_GetStatus Strm_Start Strm_GetStatus Strm_GetAudioStreamInfo \
  Scnm_GetServiceList Subttl_GetClutData Subttl_GetRegionData Teltxt_GetData; do
  toggles+=("--toggle-collect=*::${m}(*" "--toggle-collect=*::twin${m//_/}(*")
done
valgrind --tool=callgrind --callgrind-out-file="$out" "${toggles[@]}" \
  java -Djava.library.path="$build/lib" -Ddvb.epgdb="$PWD/$build/epg.db" \
  -cp "$build/java/android-dvb.jar:$build/java/dvb_bench.jar" android.DVB.Bench --count $calls \
  >/dev/null 2>&1
callgrind_annotate --inclusive=yes --threshold=100 "$out" 2>/dev/null |
  grep -E "^ *[0-9,]+ \([ 0-9.]+%\) .*::(twin[A-Za-z]+|(Cfg|Strm|Scnm|Subttl|Teltxt)_[A-Za-z]+)\(" |
  sed -E 's/^ *([0-9,]+) .*::([A-Za-z_]+)\(.*/\2 \1/' | tr -d , | sort -k1,1 -k2,2nr |
  awk -v calls=$calls '!seen[$1]++ { n[$1] = $2 / calls }
    END {
      for (m in n) if (m !~ /^twin/) {
        t = "twin" m; gsub(/_/, "", t)
        if (t in n) printf "| %s | %.0f | %.0f | %.3f |\n", m, n[m], n[t], n[m] / n[t]
      }
    }' | sort >"$out.rows"
echo "| Method | library instructions/call | twin instructions/call | ratio (target <= 1.10) |"
echo "|---|---:|---:|---:|"
cat "$out.rows"
rm -f "$out.rows"
