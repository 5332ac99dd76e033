#!/usr/bin/env bash
# Holds that docs/README.md links every page below docs/, that every relative link in a page leads to a file, and that
# the program has every message that docs/troubleshooting.md quotes. Exits 1 naming what fails.
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

# Literals that the compiler joins are joined, and what is filled in is left out.
literals=$(mktemp)
trap 'rm -f "$literals"' EXIT
cat "$1"/src/*/*.{cpp,h} "$1"/src/*/*/*.{cpp,h} 2>/dev/null | tr '\n' ' ' | sed -E 's/" *"//g' >"$literals"
# shellcheck disable=SC2016
while read -r message; do
  grep -qF -- "$message" "$literals" || { echo "$docs/troubleshooting.md: the program has no message \"$message\""; bad=1; }
  checked=$((checked + 1))
done < <(sed 's/`[^`]*`//g' "$docs/troubleshooting.md" | grep -oE '"[^"]+"' | tr -d '"' | sort -u)

[ "$checked" -gt 1 ] || { echo "no page was found below $docs"; exit 1; }
exit $bad
