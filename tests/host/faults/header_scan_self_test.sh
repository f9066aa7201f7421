#!/usr/bin/env bash
# SPDX-License-Identifier: Apache-2.0
# Plants one fault at a time in a small tree and asks header_scan.sh for its verdict.
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
tree=$(mktemp -d)
trap 'rm -rf "$tree"' EXIT
failed=0
mkdir -p "$tree/host/api/openquarn/gpu" "$tree/host/runtime/core/operations"

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
  cat >"$tree/host/runtime/core/operations/thing.def" <<'TABLE'
FAULT_POINT(HThing, change, main)
FAULT_POINT(HThing, value, eval)
FAULT_POINT(HThing, other, eval)
FAULT_POINT(HPxThing, help, main)
FAULT_POINT(HBare, open)
CANNOT_FAIL(HThing, width, main)
TABLE
  cat >"$tree/host/runtime/HThing.cpp" <<'SOURCE'
namespace {

HStatus changed(int first) {
    return apiCall(Operation::HThing_change, [&] { return HStatus(first); });
}

} // namespace

unsigned HThing::width() const { isRefused(Operation::HThing_width); }

HStatus HThing::change(int first, int second) {
    return changed(first + second);
}
HStatus HThing::change() {
    return change(1, 2);
}

int HThing::value(HStatus* status) const {
    return apiValue(Operation::HThing_value, status, 0, [&](HStatus&) { return 1; });
}

int HThing::other(HStatus& status) const {
    return apiValue(Operation::HThing_other, &status, 0, [&](HStatus&) { return 2; });
}

HStatus HPxThing::help() const {
    return OpenQuarn::apiCall(OpenQuarn::Operation::HPxThing_help, [] { return HStatus(); });
}

HStatus HBare::open() noexcept {
    return apiCall(Operation::HBare_open, [] { return HStatus(); });
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
table=runtime/core/operations/thing.def
plant '' $header ''
plant 'HThing::planted has no row FAULT_POINT' $header 's/^    HThing();/&\n    HStatus planted(int number);/'
plant 'HThing::planted has no row FAULT_POINT' $header 's/^    HThing();/&\n    HObject planted(int a,\n    HStatus* status = nullptr);/'
plant 'HThing::planted has no row FAULT_POINT' $header 's/^    HThing();/&\n    static HStatus planted() { return {}; }/'
plant 'HBare::HBare has no row FAULT_POINT' api/openquarn/gpu/HBare.h 's/^public:/&\n    HBare(HStatus* status);/'
plant 'HPxThing::planted has no row FAULT_POINT' $header 's/^protected:/&\n    HStatus planted();/'
plant 'HThing::other has no row FAULT_POINT' $table '/other/d'
plant 'HThing::gone has a row and is no function' $table 's/^FAULT_POINT(HBare.*/&\nFAULT_POINT(HThing, gone)/'
plant 'HPxThing::doIt has a row and is no function' $table 's/help/doIt/'
plant 'HThing::change has two rows' $table 's/value, eval/change, main/'
plant 'HThing::change is [main], and its row says [any]' $table 's/, main//'
plant 'HThing::value is [main], and its row says [eval]' $header 's/eval/main/'
plant 'HThing::width has no row CANNOT_FAIL' $table '/width/d'
plant 'HThing::width is [eval], and its row says [main]' $header 's/width() const; .*/width() const; \/\/\/< [eval]/'
plant 'HThing::change has no row FAULT_POINT' $table 's/^FAULT_POINT(HThing, change/CANNOT_FAIL(HThing, change/'
source=runtime/HThing.cpp
plant 'HThing::width has a row that nothing goes through' $source 's/isRefused(.*);/return 1;/'
plant 'HThing::value goes through the row of HThing::other' $source 's/HThing_value/HThing_other/'
plant 'HThing::change goes through the row of HThing::value' $source 's/HThing_change/HThing_value/'
plant 'HThing::change does not go through its row' $source 's/return change(1, 2)/return {}/'
plant 'HBare::open has a row that nothing goes through' $source 's/apiCall(Operation::HBare_open, .*/HStatus();/'
plant 'HThing::value loses the status' $source 's/HThing_value, status/HThing_value, nullptr/'
plant 'HPxThing::help loses the status' $source 's/return OpenQuarn::apiCall/OpenQuarn::apiCall/'
plant 'HBare::open has no thread tag' api/openquarn/gpu/HBare.h 's/\[any\]//'
exit $failed
