#!/usr/bin/env bash
# Fails when libfileindex exports anything but the public classes and functions of
# QIRA::FILEINDEX and the plain FILEIDX functions. Argument: the library file.
set -euo pipefail
library=${1:?usage: check-exports.sh LIBRARY}
exported=$(nm -D --defined-only "$library" | awk '{ $1 = ""; $2 = ""; print substr($0, 3) }' | c++filt)
stray=$(grep -vE '^(FILEIDX[A-Za-z]+|QIRA::FILEINDEX::|(vtable|typeinfo|typeinfo name) for QIRA::FILEINDEX::)' <<<"$exported" || true)
stray+=$'\n'$(grep -E '^QIRA::FILEINDEX::detail::' <<<"$exported" || true)
if [ -n "${stray//$'\n'/}" ]; then
  echo "check-exports: $library exports more than its interface:"
  echo "$stray" | sed '/^$/d'
  exit 1
fi
echo "check-exports: $(wc -l <<<"$exported") symbols, all of the public interface"
