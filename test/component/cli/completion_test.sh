#!/bin/bash
# SPDX-License-Identifier: Apache-2.0
#
# What bash offers when Tab is pressed: completion_test.sh <lookhaven> <source folder>
set -uo pipefail
program=$1
# shellcheck source=../../../packaging/completion/bash/lookhaven
source "$2/packaging/completion/bash/lookhaven"
failed=0

# Offers <expected words, with spaces between> <word>...: the last word is the one that is completed.
Offers() {
    local expected=$1 IFS=' '
    shift
    COMP_WORDS=("$program" "$@")
    COMP_CWORD=$#
    COMPREPLY=()
    _lookhaven
    if [[ "${COMPREPLY[*]}" != "$expected" ]]; then
        echo "lookhaven $*: offers '${COMPREPLY[*]}' instead of '$expected'"
        failed=1
    fi
}

Offers "camera" cam
Offers "remove" camera rem
Offers "remove" --home /nowhere camera rem
Offers "remove" camera --json rem
Offers "--record --record-profile" camera set 1 --record
Offers "always never schedule" camera set 1 --record ""
Offers "always" camera set 1 --record a
Offers "--help --home --json" version --
Offers "" camera set 1 --name ""  # any text
Offers "" camera frobnicate
Offers "" setup-address --wrong ""
Offers "" __complete
exit "$failed"
