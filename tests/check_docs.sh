#!/usr/bin/env bash
# Holds that docs/README.md links every page below docs/, and that every relative link in a page leads to a file.
# Exits 1 naming each page and each link that fails.
set -u
docs=$1/docs
bad=0
checked=0
while read -r page; do
  name=${page#"$docs"/}
  checked=$((checked + 1))
  if [ "$name" != README.md ] && ! grep -qF "]($name)" "$docs/README.md"; then
    echo "$docs/README.md: no link to $name"
    bad=1
  fi
  while read -r link; do
    case "$link" in
      *://* | '#'* | doi:*) continue ;;
    esac
    [ -e "$(dirname "$page")/${link%%#*}" ] || { echo "$page: the link $link leads nowhere"; bad=1; }
  done < <(grep -oE '\]\([^) ]+\)' "$page" | sed -E 's/^\]\((.*)\)$/\1/')
done < <(find "$docs" -name '*.md' | sort)
[ "$checked" -gt 1 ] || { echo "no page was found below $docs"; exit 1; }
exit $bad
