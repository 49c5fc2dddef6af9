#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
#
# Each command has a manual page, which groff sets without a complaint and which has each word of its --help:
# manual_test.sh <lookhaven> <program-page> <program of a service>...
set -uo pipefail
program=$1 program_page=$2
shift 2
pages=$(mktemp -d)
trap 'rm -rf "$pages"' EXIT
failed=0

Miss() {
    echo "$*"
    failed=1
}

# The commands that a --help lists.
CommandsOf() {
    "$program" "$@" --help | sed -n '/^Subcommands:/,$s/^  \([a-z-]*\) .*/\1/p'
}

# Set <page>: with groff, from <page>.1.
Set() {
    local complaints
    complaints=$(groff -man -ww -K utf8 -T utf8 -P -cbou "$1.1" 2>&1 >"$1") || Miss "$1: groff fails"
    [[ ! $complaints ]] || Miss "$1: $complaints"
}

# Check <page> <command>...: what the command takes, and those below it.
Check() {
    local page=$1 word commands
    shift
    for word in $("$program" "$@" --help | grep -oE -- '--[a-z-]+' | grep -vxE -- '--(help|home|json)') ; do
        grep -qF -- "$word" "$page" || Miss "$* $word is not in its manual page"
    done
    commands=$(CommandsOf "$@")
    for word in $commands; do
        grep -qF "lookhaven $* $word" "$page" || Miss "$* $word is not in its manual page"
        Check "$page" "$@" "$word"
    done
}

"$program" __manual "$pages" || Miss "no pages are written"
count=0
for command in $(CommandsOf); do
    page=$pages/lookhaven-$command
    Set "$page"
    Check "$page" "$command"
    count=$((count + 1))
done
((count > 20)) || Miss "only $count commands are listed"
for program; do
    page=$pages/$(basename "$program")
    "$program_page" "${page##*/}" 1.2.3 "$program" >"$page.1" || Miss "$program: no page is written"
    Set "$page"
    Check "$page"
done
exit "$failed"
