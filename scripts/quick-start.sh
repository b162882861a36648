#!/usr/bin/env bash
# Prints the commands between the quick-start markers of a document as a script; a line marked
# "# fails" must fail.
set -euo pipefail
echo 'set -euo pipefail'
sed -n '/<!-- quick-start -->/,/<!-- \/quick-start -->/p' "$1" | grep '^    ' | sed 's/^    //' |
  sed -E 's/^(.*)# fails(.*)$/! \1 # fails\2/'
