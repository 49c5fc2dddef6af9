#!/bin/sh
# SPDX-License-Identifier: Apache-2.0
#
# Compares what the built module exports with what its framework looks up: exports_test.sh NM MODULE
set -eu
[ "$(basename "$2")" = VEXO.Lookhaven.Player.so ] || { echo "unexpected file name: $2"; exit 1; }
wanted='D gTable
T GetAPITable
T Process
T ProcessLiveviewSrc
T ProcessLoadCamera
T ProcessPlayEvent'
found=$("$1" -D --defined-only "$2" | cut -d ' ' -f 2- | LC_ALL=C sort)
[ "$found" = "$wanted" ] || { printf 'exports:\n%s\n' "$found"; exit 1; }
