#!/usr/bin/env bash
# Man page and completion know every command and option that the tool has, the documents show commands
# as the tool takes them, and the completion finds saved ids.
#   tool_documents_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1 source=$2
PATH=$build/tools/zyrovfs:$PATH
code=0

complain() {
  echo "$*" >&2
  code=1
}

# Subcommands that the help of a command lists.
commands_of() { zyrovfs "$@" --help | sed -n '/^Subcommands:/,$s/^  \([a-z][a-z]*\) .*/\1/p'; }
options_of() { zyrovfs "$@" --help | grep -oE '^  (-h,)?--[a-z-]+' | sed 's/^ *\(-h,\)\{0,1\}//'; }

# What the completion offers for the last of these words.
complete_words() {
  COMP_WORDS=("$@")
  COMP_CWORD=$((${#COMP_WORDS[@]} - 1))
  COMPREPLY=()
  _zyrovfs || true
  printf '%s\n' "${COMPREPLY[@]}"
}

expect() { # EXPECTED WORD... : exactly these are offered, in any order
  local expected=$1 offered
  shift
  offered=$(complete_words "$@" | sort | xargs)
  [ "$offered" = "$expected" ] || complain "after '$*': offered '$offered', expected '$expected'"
}

. "$source/packaging/zyrovfs.bash-completion"
page=$(man -l "$source/packaging/zyrovfs.1" 2>/dev/null | col -b | tr '‐−' '--') ||
  page=$(sed 's/\\-/-/g' "$source/packaging/zyrovfs.1")
[ -z "$(man --warnings -l "$source/packaging/zyrovfs.1" 2>&1 >/dev/null)" ] ||
  complain "the man page has warnings"

# check_command WORD...: its options stand in the page and are offered.
check_command() {
  local option
  for option in $(options_of "$@"); do
    grep -q -e "$option" <<<"$page" || complain "the man page lacks $option of '$*'"
  done
  expect "$(options_of "$@" | sort | xargs)" zyrovfs "$@" --
}

count=0
# check_group WORD...: the commands of a group, and of the groups in it.
check_group() {
  local command commands
  commands=$(commands_of "$@" | sort | xargs)
  if [ -n "$commands" ]; then
    expect "$commands" zyrovfs "$@" ""
    for command in $commands; do check_group "$@" "$command"; done
    return
  fi
  count=$((count + 1))
  grep -q -e "${*: -1}" <<<"$page" || complain "the man page lacks '$*'"
  check_command "$@"
}
check_group
[ $count = 33 ] || complain "found $count commands, not 33"

# Every command for a user that a document shows is one that the tool understands; there is no such
# user here, so none does anything.
shown=0
while read -r line; do
  shown=$((shown + 1))
  status=0
  zyrovfs ${line#*zyrovfs } </dev/null >/dev/null 2>&1 || status=$?
  [ $status = 1 ] || complain "shown in a document, but ends with $status: $line"
done < <({ cat "$source/README.md" "$source"/docs/*.md; sed 's/\\-/-/g' "$source/packaging/zyrovfs.1"; } |
  grep -oE '(^|[ (])zyrovfs [^`)]*--user amy[^`)]*')
[ $shown -ge 5 ] || complain "found only $shown commands in the documents"

useradd --uid 4001 --gid 100 amy
id=ftp://nas.example:2121
zyrovfs profile add --user amy --protocol ftp --hostname nas.example --port 2121 >/dev/null
expect "$id" zyrovfs profile show --user amy ""
expect "$id" zyrovfs connection add --uid 4001 f
expect "" zyrovfs profile show --user amy x
expect "" zyrovfs profile show ""
expect "" zyrovfs connection delete --uid 4001 ""
expect "amy" zyrovfs profile list --user amy
zyrovfs task add copy job --pid $$ --user amy >/dev/null
expect "copy" zyrovfs task clean --user amy ""
expect "rmdir" zyrovfs task run copy --user amy -- rmdi
expect "admin all" zyrovfs policy set --type a
expect "amy" zyrovfs policy set --enable amy
expect "sudo" zyrovfs policy set --enable-group sud
expect "dav davs" zyrovfs profile list --protocol da
[ $code != 0 ] || echo "man page and completion: ok"
exit $code
