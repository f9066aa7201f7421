#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Plants one fault at a time in a small tree and asks header_scan.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0
mkdir -p "$tree/host/api/openquarn/gpu" "$tree/host/runtime/core/faults"

write_tree() {
  cat >"$tree/host/api/openquarn/HThing.h" <<'HEADER'
/// A thing. [any] unless a call says otherwise.
class OPENQUARN_API HThing : public HFnBase {
public:
    HThing();
    explicit HThing(const HObject& object, HStatus* status = nullptr);
    bool operator==(const HThing& other) const { return true; }
    /// Fails. [main]
    HStatus change(int first,
                   int second);
    /// Reads. [eval]
    int value(HStatus* status = nullptr) const;
    int other(HStatus& status) const;

    unsigned length() const { return 0; }
    unsigned width() const; ///< [main]

private:
    HStatus hidden();
};

/// A plug-in's own. [main]
class OPENQUARN_API HPxThing {
public:
    virtual HStatus doIt();

protected:
    HStatus help() const;
};
HEADER
  cat >"$tree/host/api/openquarn/gpu/HBare.h" <<'HEADER'
/// Without a tag.
class OPENQUARN_API HBare {
public:
    static HStatus open() noexcept; ///< [any]
};
HEADER
  cat >"$tree/host/runtime/core/faults/thing.def" <<'TABLE'
FAULT_POINT(HThing, change, main)
FAULT_POINT(HThing, value, eval)
FAULT_POINT(HThing, other, eval)
FAULT_POINT(HPxThing, help, main)
FAULT_POINT(HBare, open)
TABLE
  cat >"$tree/host/runtime/HThing.cpp" <<'SOURCE'
namespace {

HStatus changed(int first) {
    return apiCall(FaultPoint::HThing_change, [&] { return HStatus(first); });
}

} // namespace

unsigned HThing::width() const { isRefused(ThreadTag::main, "HThing::width"); }

HStatus HThing::change(int first, int second) {
    return changed(first + second);
}
HStatus HThing::change() {
    return change(1, 2);
}

int HThing::value(HStatus* status) const {
    return apiValue(FaultPoint::HThing_value, status, 0, [&](HStatus&) { return 1; });
}

int HThing::other(HStatus& status) const {
    return apiValue(FaultPoint::HThing_other, &status, 0, [&](HStatus&) { return 2; });
}

HStatus HPxThing::help() const {
    return OpenQuarn::apiCall(OpenQuarn::FaultPoint::HPxThing_help, [] { return HStatus(); });
}

HStatus HBare::open() noexcept {
    return apiCall(FaultPoint::HBare_open, [] { return HStatus(); });
}
SOURCE
}

# plant TEXT_OF_THE_VERDICT FILE SED_SCRIPT; no text: nothing is wrong
plant() {
  local expected=$1 status=0
  write_tree
  sed -i "$3" "$tree/host/$2"
  "$here/header_scan.sh" "$tree" >"$tree/log" || status=$?
  if [[ -z $expected && $status == 0 ]] || { [[ -n $expected && $status == 1 ]] && grep -qF -- "$expected" "$tree/log"; }; then
    return
  fi
  printf 'expected "%s" of %s, had status %s:\n' "$expected" "$3" "$status"
  cat "$tree/log"
  failed=1
}

header=api/openquarn/HThing.h
table=runtime/core/faults/thing.def
plant '' $header ''
plant 'HThing::planted can fail and has no fault point' $header 's/^    HThing();/&\n    HStatus planted(int number);/'
plant 'HThing::planted can fail and has no fault point' $header 's/^    HThing();/&\n    HObject planted(int a,\n    HStatus* status = nullptr);/'
plant 'HThing::planted can fail and has no fault point' $header 's/^    HThing();/&\n    static HStatus planted() { return {}; }/'
plant 'HBare::HBare can fail and has no fault point' api/openquarn/gpu/HBare.h 's/^public:/&\n    HBare(HStatus* status);/'
plant 'HPxThing::planted can fail and has no fault point' $header 's/^protected:/&\n    HStatus planted();/'
plant 'HThing::other can fail and has no fault point' $table '/other/d'
plant 'HThing::gone has a fault point and is no function' $table 's/^FAULT_POINT(HBare.*/&\nFAULT_POINT(HThing, gone)/'
plant 'HPxThing::doIt has a fault point and is no function' $table 's/help/doIt/'
plant 'HThing::change has two fault points' $table 's/value, eval/change, main/'
plant 'HThing::change is [main], and its fault point says [any]' $table 's/, main//'
plant 'HThing::value is [main], and its fault point says [eval]' $header 's/eval/main/'
plant 'HThing::width is [main] and does not check it' runtime/HThing.cpp 's/width"/length"/'
plant 'HThing::width is [eval] and does not check it' $header 's/width() const; .*/width() const; \/\/\/< [eval]/'
source=runtime/HThing.cpp
plant 'HThing::value fails under the name of HThing::other' $source 's/HThing_value/HThing_other/'
plant 'HThing::change fails under the name of HThing::value' $source 's/HThing_change/HThing_value/'
plant 'HThing::change does not go through its fault point' $source 's/return change(1, 2)/return {}/'
plant 'HBare::open has a fault point that nothing goes through' $source 's/apiCall(FaultPoint::HBare_open, .*/HStatus();/'
plant 'HThing::value loses the status' $source 's/HThing_value, status/HThing_value, nullptr/'
plant 'HPxThing::help loses the status' $source 's/return OpenQuarn::apiCall/OpenQuarn::apiCall/'
plant 'HBare::open has no thread tag' api/openquarn/gpu/HBare.h 's/\[any\]//'
exit $failed
