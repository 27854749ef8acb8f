#!/bin/sh
# Measures docuvane-mkindex --scan on the installed TeX documentation:
# full scan (empty cache) against pdftotext run over the same PDFs one after
# another, peak memory, a re-scan with nothing changed, and the index size.
#   bench/scan_measure.sh BUILD_DIR [TREE]
set -eu
build=${1:?usage: scan_measure.sh BUILD_DIR [TREE]}
tree=${2:-$(kpsewhich -var-value TEXMFDIST)}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
export XDG_CACHE_HOME="$work/cache"
tool="$build/docuvane-mkindex"
now() { date +%s.%N; }

find -L "$tree/doc" -name '*.pdf' | sort > "$work/pdfs"
echo "PDFs: $(wc -l < "$work/pdfs")"

echo "load before: $(uptime)"
t0=$(now)
/usr/bin/time -f "%M %U %S" -o "$work/peak" "$tool" --scan "$tree" 2> "$work/scan.err"
t1=$(now)
tail -1 "$work/scan.err"
echo "warnings: $(grep -c warning "$work/scan.err" || true)"
scan=$(echo "$t1 - $t0" | bc)
read -r peak user sys < "$work/peak"
echo "full scan: $scan s wall, $(echo "$user + $sys" | bc) s CPU (all processes)," \
  "largest RSS of one process $peak KiB"

t0=$(now)
"$tool" --scan "$tree" 2> /dev/null
t1=$(now)
echo "re-scan, nothing changed: $(echo "$t1 - $t0" | bc) s"
echo "index: $(stat -c %s "$work/cache/lomari/texmf/Update/command.Index") bytes"

t0=$(now)
/usr/bin/time -f "%U %S" -o "$work/cpu" sh -c \
  'while read -r pdf; do pdftotext -q "$pdf" - > /dev/null || true; done' < "$work/pdfs"
t1=$(now)
seq=$(echo "$t1 - $t0" | bc)
read -r user sys < "$work/cpu"
echo "pdftotext one after another: $seq s wall, $(echo "$user + $sys" | bc) s CPU"
echo "ratio full scan / pdftotext: $(echo "scale=2; $scan / $seq" | bc)"
echo "load after: $(uptime)"
