#!/bin/sh
# Precision and recall of the scanned word index against the printed
# indexes of several installed manuals.
#   bench/scan_quality.sh BUILD_DIR [INDEX]
# Without INDEX, a full scan of TEXMFDIST is made into a temporary user
# tree first.  For every word below, EXPECTED are the physical pages that
# the manual's own index lists for it (printed page numbers turned into
# physical ones through the page labels, ranges such as 19-21 counted
# page by page), each checked with that page's text (pdftotext -f N -l N):
# the script says so when an expected page does not show the word.  The
# manuals without a printed index (grfguide, usrguide, clsguide) have as
# EXPECTED the pages of the section that describes the command, read by
# hand (grfguide page 10 carries on the keys of \includegraphics without
# naming it).
#   precision: listed pages that are expected / pages listed for the manual
#   recall:    expected pages that are listed / expected pages
set -eu
build=${1:?usage: scan_quality.sh BUILD_DIR [INDEX]}
index=${2:-}
doc=$(kpsewhich -var-value TEXMFDIST)/doc
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
if [ -z "$index" ]; then
  XDG_CACHE_HOME="$work/cache" "$build/docuvane-mkindex" --scan "$(dirname "$doc")" 2> /dev/null
  index="$work/cache/lomari/texmf/Update/command.Index"
fi
"$build/docuvane-mkindex" --dump "$index" > "$work/dump"

# manual | word | expected physical pages
cat > "$work/expected" << 'EOF'
latex/amsmath/amsldoc.pdf|\binom|20 21
latex/amsmath/amsldoc.pdf|\boldsymbol|28 29
latex/amsmath/amsldoc.pdf|\DeclareMathOperator|6 23 24 25
latex/amsmath/amsldoc.pdf|\intertext|14 15 37
latex/amsmath/amsldoc.pdf|\substack|25
latex/amsmath/amsldoc.pdf|{align}|8 10 11 13 30 35 36 37
latex/amsmath/amsldoc.pdf|{gather}|10 11 13 30 35 36 37
latex/amsmath/amsldoc.pdf|{cases}|13 37
latex/amsmath/amsldoc.pdf|{split}|6 8 10 11 14 30 33 35 36 37
latex/amsmath/amsldoc.pdf|{multline}|8 10 37
latex/l3kernel/interface3.pdf|\cs_new:Npn|24 25 29 72 73
latex/l3kernel/interface3.pdf|\tl_set:Nn|114 128 129 155 238 323
latex/l3kernel/interface3.pdf|\seq_map_inline:Nn|159 164
latex/l3kernel/interface3.pdf|\int_eval:n|29 43 167 168 169 170 171 178 318
latex/l3kernel/interface3.pdf|\prg_new_conditional:Npnn|72 73 74
latex/l3kernel/interface3.pdf|\keys_define:nn|233
latex/xcolor/xcolor.pdf|\definecolor|19 28
latex/xcolor/xcolor.pdf|\colorlet|20
latex/xcolor/xcolor.pdf|\rowcolors|28
latex/fancyhdr/fancyhdr.pdf|\fancyhead|10 12
latex/fancyhdr/fancyhdr.pdf|\fancypagestyle|14
latex/fancyhdr/fancyhdr.pdf|\headrulewidth|10 17 21
latex/memoir/memman.pdf|\chapterstyle|125 126
latex/memoir/memman.pdf|\epigraph|295 296 297 298
latex/memoir/memman.pdf|\setlrmarginsandblock|54 56 61
latex/beamer/beameruserguide.pdf|\frametitle|73
latex/beamer/beameruserguide.pdf|\pause|78
latex/beamer/beameruserguide.pdf|{frame}|57
latex/beamer/beameruserguide.pdf|{block}|116
latex/graphics/grfguide.pdf|\includegraphics|9 10 11 12
latex/graphics/grfguide.pdf|\rotatebox|8
latex/graphics/grfguide.pdf|\scalebox|8
latex/graphics/grfguide.pdf|\resizebox|8 9
latex/graphics/grfguide.pdf|\DeclareGraphicsExtensions|13
latex/base/usrguide.pdf|\NewDocumentCommand|4
latex/base/usrguide.pdf|\IfNoValueTF|7
latex/base/usrguide.pdf|\NewCommandCopy|16
latex/base/usrguide.pdf|\ExpandArgs|17
latex/base/clsguide.pdf|\DeclareOption|12 17 18
latex/base/clsguide.pdf|\ProvidesPackage|10 16
latex/base/clsguide.pdf|\RequirePackage|11 17
latex/base/clsguide.pdf|\PassOptionsToPackage|18
EOF

# Pages whose text does not show the word (variants such as \tl_set:Nx
# for \tl_set:Nn, which the printed index merges, are reported too).
while IFS='|' read -r manual word pages; do
  [ -f "$doc/$manual" ] || { echo "missing: $manual"; continue; }
  key=$(printf '%s' "$word" | sed 's/^{\(.*\)}$/\1/')
  for p in $pages; do
    pdftotext -q -f "$p" -l "$p" "$doc/$manual" - | grep -qF -- "$key" ||
      printf 'note: %s page %s does not show %s\n' "$manual" "$p" "$word"
  done
done < "$work/expected"

awk -F'|' -v dump="$work/dump" '
  BEGIN {
    while ((getline line < dump) > 0) {
      split(line, f, "\t")
      listed[f[1] "|" f[2]] = f[3]
    }
  }
  {
    n = split($3, want, " "); delete isWanted
    for (i = 1; i <= n; i++) isWanted[want[i]] = 1
    m = split(listed[$2 "|" $1], got, " ")
    hit = 0
    for (i = 1; i <= m; i++) if (got[i] in isWanted) hit++
    printf "%-26s %-34s listed %-28s precision %d/%d recall %d/%d\n", $2, $1, \
           "[" listed[$2 "|" $1] "]", hit, m, hit, n
    H += hit; M += m; N += n; words++
    manuals[$1] = 1
  }
  END {
    k = 0; for (x in manuals) k++
    printf "\n%d words in %d manuals: precision %d/%d = %.1f %%, recall %d/%d = %.1f %%\n", \
           words, k, H, M, (M ? 100 * H / M : 0), H, N, (N ? 100 * H / N : 0)
  }' "$work/expected"
