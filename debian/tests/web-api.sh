# SPDX-License-Identifier: Apache-2.0
# shellcheck shell=bash
#
# What a client asks of installed services, for the scripts that read this file. They set work, a folder for answers, and
# port, that of plain HTTP.

Fail() {
    echo "${0##*/}: $*" >&2
    exit 1
}

# WaitFor <seconds> <what> <command>...: until the command succeeds.
WaitFor() {
    local limit=$1 what=$2 deadline
    shift 2
    deadline=$((SECONDS + limit))
    until "$@" >/dev/null 2>&1; do
        ((SECONDS < deadline)) || Fail "not within $limit s: $what"
        sleep 0.2
    done
}

# Fetch <file> <seconds> <query> [<option of curl>...]: an answer of the web API; fails as curl does.
Fetch() {
    local file=$work/$1 limit=$2 query=$3
    shift 3
    curl --silent --fail --max-time "$limit" --cookie "$work/cookies" --cookie-jar "$work/cookies" --output "$file" "$@" \
        "http://127.0.0.1:$port/webapi?version=1&$query"
}

# MakeFirstAccount <token>
MakeFirstAccount() {
    Fetch first-account 20 "api=VEXO.Auth&method=MakeFirstAccount" \
        --data "account=owner&password=correct+horse&token=$1" || Fail "the printed address makes no account"
}

LogIn() {
    Fetch log-in 20 "api=VEXO.Auth&method=Login" --data "account=owner&password=correct+horse"
}

# Whether the stream of a query shows pictures, of 100 kB or more within two seconds, after which curl fails with 28.
Shows() {
    local status=0
    rm -f "$work/stream"
    Fetch stream 2 "$1" || status=$?
    ((status == 0 || status == 28)) && (($(stat -c %s "$work/stream") > 100000)) && grep -aq "image/jpeg" "$work/stream"
}

IsLive() {
    Shows "api=VEXO.Lookhaven.Player.LiveviewSrc&method=Play&camera=1"
}

# The first recorded event of a camera.
FindEvent() {
    local now
    now=$(date +%s)
    Fetch events 20 "api=VEXO.Lookhaven.Player&method=EnumEvent&cameralists=$1&from=$((now - 3600))&to=$((now + 60))&recording=true" &&
        event=$(grep -oE '"id" ?: ?[0-9]+' "$work/events" | grep -oE '[0-9]+$' | head -n 1) && [[ $event ]]
}

# A camera's recording. H.264 is decoded in a process that confines itself inside the service's own confinement.
IsPlayed() {
    FindEvent "$1" && Shows "api=VEXO.Lookhaven.Player&method=PlayMjpegEvent&eventid=$event&timestamp=1&flushHeader=1"
}

HasStill() {
    Fetch still 20 "api=VEXO.Picture&method=Get&camera=2" && grep -aq JFIF "$work/still"
}
