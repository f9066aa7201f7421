# SPDX-License-Identifier: Apache-2.0
# Reads sources of the runtime and says, separated by tabs, which function of a class goes through which row of the table
# of operations: "uses", place, function, operation. These are the operations that its body names and those of the file's
# own helpers that it calls. "none" stands for a function that can fail and names none, neither calls another overload of
# itself; "loses" for one that drops the status. Relies on the formatting: a definition begins in the first column.

function finish() {
    if (name == "")
        return
    ++functions
    nameOf[functions] = name
    bodyOf[functions] = body
    placeOf[functions] = FILENAME ":" begin
    name = ""
}

function begins(text) {
    return text ~ /^[A-Za-z].*\(/ && text !~ /^(namespace|class|struct|enum|using|static_assert|return|template|constexpr|extern)/
}

# the points named in a body, or reached by a helper that is called in it: " A::b C::d "
function pointsOf(i,    text, point, found, j) {
    if (i in known)
        return known[i]
    known[i] = "" # a helper that calls itself
    text = bodyOf[i]
    while (match(text, /Operation::[A-Za-z0-9]+_[A-Za-z0-9]+/)) {
        point = substr(text, RSTART + 11, RLENGTH - 11)
        sub(/_/, "::", point)
        found = found " " point
        text = substr(text, RSTART + RLENGTH)
    }
    for (j = 1; j <= functions; ++j)
        if (j != i && nameOf[j] !~ /::/ && bodyOf[i] ~ ("(^|[^A-Za-z0-9_:.])" nameOf[j] "(<[^(]*>)?\\("))
            found = found " " pointsOf(j)
    return known[i] = found
}

function report(    i, own, points, n, k, signature, rest) {
    finish()
    for (i = 1; i <= functions; ++i) {
        if (bodyOf[i] ~ /apiValue\([^,]*, nullptr/ || bodyOf[i] ~ /[;{}] *\n *(OpenQuarn::)?apiCall\(/)
            print "loses\t" placeOf[i] "\t" nameOf[i]
        if (nameOf[i] !~ /^[A-Za-z0-9_]+::[A-Za-z0-9_]+$/)
            continue
        n = split(pointsOf(i), points, " ")
        for (k = 1; k <= n; ++k)
            print "uses\t" placeOf[i] "\t" nameOf[i] "\t" points[k]
        own = nameOf[i]
        sub(/.*::/, "", own)
        signature = rest = bodyOf[i]
        sub(/\{.*/, "", signature)
        sub(/^[^(]*\(/, "", rest)
        if (n == 0 && signature ~ /HStatus/ && rest !~ ("(^|[^A-Za-z0-9_])" own "(<[^(]*>)?\\("))
            print "none\t" placeOf[i] "\t" nameOf[i]
    }
    functions = 0
    split("", known)
}

FNR == 1 {
    report()
}

{
    sub(/[ \t]*\/\/.*/, "")
}

name == "" && begins($0) && $0 !~ /;$/ {
    body = ""
    name = $0
    begin = FNR
    depth = 0
    sub(/\(.*/, "", name)
    sub(/^.*[ *&]/, "", name)
    sub(/^OpenQuarn::/, "", name)
    gsub(/<[^>]*>/, "", name)
}

name != "" {
    body = body "\n" $0
    opened = gsub(/\{/, "{")
    depth += opened - gsub(/\}/, "}")
    if (depth == 0 && body ~ /\{/)
        finish()
    else if (depth == 0 && $0 ~ /;$/)
        name = "" # it was a declaration
}

END {
    report()
}
