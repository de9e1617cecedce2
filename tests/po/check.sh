#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Every text of the code is in the template and, translated, in every catalogue, and nothing else is. Usage:
#
#   check.sh SOURCE
set -uo pipefail
cd "$1/po" || exit 1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
source ../tests/support/checks.sh

keys() { msgattrib --no-obsolete --no-wrap --sort-output "$@" | sed -n 's/^msgid "\(.\+\)"$/\1/p'; }
has_all_keys() { diff "$work/keys" <(keys "$1"); }
is_translated() { diff /dev/null <(msgattrib --no-wrap --untranslated "$1") && diff /dev/null <(msgattrib --only-fuzzy "$1"); }
keeps_the_application() {  # each text with {} has it in its translation, and no other
  msgattrib --no-obsolete --no-wrap "$1" | awk '/^msgid / { asked = /\{\}/ } /^msgstr / && asked != /\{\}/ { print; bad = 1 } END { exit bad }'
}

grep -rlZ --include='*.cpp' OVLocalizedString ../src |
  xargs -0 xgettext --from-code=UTF-8 --keyword=OVLocalizedString --output="$work/code.pot"
keys "$work/code.pot" >"$work/keys"
check "the code has texts" [ -s "$work/keys" ]
check "the template has the texts of the code" has_all_keys OrvidCore.pot
for catalogue in *.po; do
  check "$catalogue is a catalogue" msgfmt --check --output-file="$work/catalogue.mo" "$catalogue"
  check "$catalogue is built" grep -qw "${catalogue%.po}" CMakeLists.txt
  check "$catalogue has the texts of the code" has_all_keys "$catalogue"
  check "$catalogue is translated" is_translated "$catalogue"
  check "$catalogue keeps the place of the application" keeps_the_application "$catalogue"
done
exit $failed
