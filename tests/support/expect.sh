# SPDX-License-Identifier: Apache-2.0
# For tests of a command line, to be sourced with $quarn and the folder $work set. $bad becomes 1 with a failure.
bad=0
fail() { echo "$*"; cat "$work/out" "$work/err"; bad=1; }
# expect STATUS OUT-PATTERN ERR-PATTERN ARGS...: patterns are regular expressions, "" for an empty stream; standard
# input is $work/in where there is one
expect() {
  local status=0 wanted=$1 out=$2 err=$3 in=/dev/null
  shift 3
  [[ ! -e $work/in ]] || in=$work/in
  "$quarn" "$@" >"$work/out" 2>"$work/err" <"$in" || status=$?
  [[ $status == "$wanted" ]] && fits "$out" "$work/out" && fits "$err" "$work/err" ||
    fail "quarn $*: status $status, not $wanted, and /$out/ and /$err/:"
}
fits() { if [[ $1 ]]; then grep -Pqz -- "$1" "$2"; else [[ ! -s $2 ]]; fi; }
