#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Holds a program's manual page and bash completion against its --help: every verb and option is in
# both, and nothing else is.
#   help_test.sh PROGRAM COMPLETION [PAGE]
set -uo pipefail
program=$1 completion=$2 page=${3:-}
name=$(basename "$program")
PATH=$(dirname "$program"):$PATH
failures=0

fail() {
    echo "$name: $*" >&2
    failures=$((failures + 1))
}

# What --help lists, from standard input: long options, verbs.
options() { sed -nE 's/^ +(-.*)/\1/p' | sed 's/  .*//' | grep -oE -e '--[a-z-]+' | sort; }
verbs() { sed -nE 's/^  ([a-z][a-z-]*)  +[A-Z].*/\1/p' | sort; }

# What is offered behind these words, the last of which may be begun only.
source "$completion"
timeout() { "${@:2}"; } # a busy machine may take longer than a user would wait
function_name=$(complete -p "$name" | sed -nE 's/.*-F ([^ ]+) .*/\1/p')
offered() {
    COMP_LINE="$*" COMP_POINT=${#COMP_LINE} COMP_WORDS=("$@") COMP_CWORD=$(($# - 1))
    COMPREPLY=()
    if [ -n "$function_name" ]; then
        "$function_name" "$1" "${COMP_WORDS[COMP_CWORD]}" "${COMP_WORDS[COMP_CWORD - 1]}" 2>/dev/null
    else
        eval "COMPREPLY=(\$(compgen $(complete -p "$name" | sed 's/^complete//; s/ [^ ]*$//') -- '${*: -1}'))"
    fi
    printf '%s\n' "${COMPREPLY[@]}" | grep -v '^\(--\)\?$' | sort
}
expect() { # WHAT EXPECTED ACTUAL
    [ "$2" = "$3" ] || fail "$1: $(diff <(echo "$2") <(echo "$3") | tr '\n' ' ')"
}

text=
[ -z "$page" ] || text=$(mandoc -Tascii -O width=100 "$page" | sed 's/.\x08//g' | tr -d '[]')
every_option=

# Holds one verb (none: the program itself) and the verbs below it.
walk() {
    local help own below verb
    help=$("$program" "$@" --help) || fail "$* --help fails"
    ! grep -E '.{81}' <<<"$help" || fail "$* --help is wider than a terminal"
    own=$(options <<<"$help")
    below=$(verbs <<<"${help%%Examples:*}")
    every_option+=$own$'\n'
    expect "$* -" "$(printf '%s\n' "$own" ${1:+--adapter --json --timeout} | sort -u)" "$(offered "$name" "$@" -)"
    [ -z "$below" ] || expect "$*" "$below" "$(offered "$name" "$@" '' | grep -v :)"
    if [ $# -gt 0 ] && [ -z "$below" ] && [ -n "$text" ]; then
        grep -qE "(^ {7}|, )$*( |,|$)" <<<"$text" || fail "the page has no $*"
    fi
    for verb in $below; do
        walk "$@" "$verb"
    done
}
walk

if [ -n "$text" ]; then
    for option in $every_option; do
        grep -qE -e "(^|[ |])$option\b" <<<"$text" || fail "the page has no $option"
    done
    for option in $(grep -E '^ {7}-' <<<"$text" | grep -oE -e '--[a-z-]+'); do
        grep -qxe "$option" <<<"$every_option" || fail "the page has $option, and --help has not"
    done
    lint=$(mandoc -Tlint -W warning "$page" | grep -v 'skipping paragraph macro') # as scdoc writes them
    [ -z "$lint" ] || fail "$lint"
fi

case $name in
kesbt) # runs beside the simulated daemon
    mouse=00:11:22:33:44:06
    expect adapters $'hci0\nhci1' "$(offered kesbt --adapter h)"
    expect "known devices" $mouse "$(offered kesbt services '')"
    COMP_WORDBREAKS=$' \t\n:'
    expect "behind a colon" 44:06 "$(offered kesbt --adapter hci0 audio connect 00:11:22:33:)"
    COMP_WORDBREAKS=$' \t\n'
    expect "whole addresses" $mouse "$(offered kesbt wait paired 00:11)"
    expect "no second address" '' "$(offered kesbt remove $mouse '')"
    expect properties $'Pairable\nPairableTimeout' "$(offered kesbt adapter set Pair)"
    expect values $'false\ntrue' "$(offered kesbt adapter set powered '')"
    expect "no value of a number" '' "$(offered kesbt adapter set PairableTimeout '')"
    expect capabilities $'DisplayOnly\nDisplayYesNo' "$(offered kesbt pair $mouse --capability D)"
    expect "an option's value" '' "$(offered kesbt --timeout '')"
    ;;
bluez4-sim)
    expect "the command" kesbt-test-command "$(kesbt-test-command() { :; } && offered bluez4-sim -- kesbt-test-c)"
    for behaviour in $("$program" --list-behaviours | cut -d' ' -f1); do
        [ -z "$text" ] || grep -qw "$behaviour" <<<"$text" || fail "the page has no behaviour $behaviour"
    done
    ;;
esac
[ $failures -eq 0 ]
