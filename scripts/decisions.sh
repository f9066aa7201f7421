#!/usr/bin/env bash
# decisions.sh [--check] [ROOT]: writes docs/decisions/README.md, the index of the records, and gives a record without a
# date today's. With --check it changes nothing, and says what is wrong: an index that is not of today, a record without
# number, title or date, and a record that is named somewhere and is not there. Exit status 1 when there is one.
set -euo pipefail
checking=
if [[ ${1:-} == --check ]]; then checking=yes && shift; fi
cd "${1:-$(dirname "$0")/..}"
folder=docs/decisions

bad=0
complain() {
  printf '%s\n' "$*"
  bad=1
}

# read_head FILE: its first three lines, in `lines`
read_head() {
  mapfile -t -n 3 lines <"$folder/$1"
  lines+=('' '' '')
}

records() { find "$folder" -name '[0-9]*.md' -printf '%f\n' | sort; }

# --- the records ---

# check_record FILE: "# NNNN: title", an empty line, "**Date.** YYYY-MM-DD"
check_record() {
  local file=$1 number=${1%%-*} lines
  read_head "$file"
  [[ $file =~ ^[0-9]{4}-[a-z0-9-]+\.md$ ]] || complain "$folder/$file: not named NNNN-title.md, in small letters"
  [[ ${lines[0]} == "# $number: "?* ]] || complain "$folder/$file:1: not '# $number: title'"
  if [[ ! ${lines[2]} =~ ^\*\*Date\.\*\*\ 20[0-9]{2}-[01][0-9]-[0-3][0-9]$ ]]; then
    if [[ ! $checking && ${lines[2]} != '**Date.**'* ]]; then
      sed -i "1a\\\n**Date.** $(date +%F)" "$folder/$file"
    else
      complain "$folder/$file:3: not '**Date.** YYYY-MM-DD'; scripts/decisions.sh puts today's where there is none"
    fi
  fi
}

index() {
  local file lines
  cat <<'TEXT'
# Decisions

A record says what was decided, why, and what was rejected, in half a page. It is not changed to follow what came later:
that is a record of its own, to which the old one links.

To add one, take the next free number: `NNNN-title.md`, which begins with `# NNNN: title`, an empty line and
`**Date.** YYYY-MM-DD`. Then run `scripts/decisions.sh`, which fills in today's date where there is none and writes
this page. Where a decision constrains one place in the code, name it there: `// decision NNNN`. A test sees that every
number named in the tree has a record, and that this page is of today.

| | decision | date |
|---|---|---|
TEXT
  while read -r file; do
    read_head "$file"
    printf '| [%s](%s) | %s | %s |\n' "${file%%-*}" "$file" "${lines[0]#*: }" "${lines[2]#* }"
  done < <(records)
}

# --- who names them ---

# lines "file:line:text" of the tree outside of the records that name a decision by its number
naming_lines() {
  grep -rnIoE --exclude-dir={build,demo-out,tutorial,.git,.cache} --exclude-dir=__pycache__ --exclude=.git \
    '[Dd]ecisions?:? [0-9]{4}((,| and|, and) [0-9]{4})*' . || true
  # and links, in the records too
  grep -rnoE --include='*.md' --exclude-dir={build,demo-out,tutorial,.git} '\([a-z./]*[0-9]{4}-[^)]*\.md' . || true
}

check_names() {
  local place line text number known=" "
  while read -r number; do known+="$number "; done < <(records)
  while IFS=: read -r place line text; do
    if [[ $text == *.md ]]; then
      text=${text##*[(/]}
      [[ $known == *" $text "* ]] || complain "${place#./}:$line: there is no $folder/$text"
    else
      for number in $(grep -oE '[0-9]{4}' <<<"$text"); do
        [[ $known == *" $number-"* ]] || complain "${place#./}:$line: there is no decision $number"
      done
    fi
  done < <(naming_lines)
}

before=
while read -r file; do
  check_record "$file"
  [[ ${file%%-*} != "$before" ]] || complain "$folder/$file: the number $before is taken twice"
  before=${file%%-*}
done < <(records)
[[ $before ]] || complain "there is no record in $PWD/$folder"
check_names
if [[ ! $checking ]]; then
  index >"$folder/README.md"
elif ! index | cmp -s - "$folder/README.md"; then
  complain "$folder/README.md is not of today: run scripts/decisions.sh"
fi
exit $bad
