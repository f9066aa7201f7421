# SPDX-License-Identifier: Apache-2.0
# Lists the functions that the headers given as arguments declare: class, name, kind, thread tag and header, separated by
# tabs. Relies on the formatting of the headers (one declaration a statement, a class head on one line).
#
# Kinds:
#   fails   returns an HStatus or takes one to write to: needs a fault point
#   attach  a constructor of a function set that attaches it: fails as HFnBase::setObject does, and by its fault point
#   plugin  a virtual function of an HPx... class or of a ...RegistrationInfo: the plug-in's to write, the host's to call
#   plain   any other function that the host defines
#   inline  any other function that the header defines
# Constructors that cannot fail, destructors and operators are left out, and so is HStatus itself.
#
# A function's tag is the last one in the comment at its own line, in the comment above it, in a comment further up with
# no blank line between, or in the comment of its class or of a base of that. "-" when there is none.

function lastTag(text,    tag) {
    tag = ""
    while (match(text, /\[(main|eval|any)\]/)) {
        tag = substr(text, RSTART + 1, RLENGTH - 2)
        text = substr(text, RSTART + RLENGTH)
    }
    return tag
}

function count(text, pattern) {
    return gsub(pattern, "", text)
}

function enterClass(head,    parts) {
    classDepth[++classes] = depth
    sub(/ final/, "", head)
    className[classes] = head
    sub(/[ :{].*/, "", className[classes])
    access[classes] = isStruct ? "public" : "private"
    if (match(head, /: public [A-Za-z0-9_]+/))
        baseOf[className[classes]] = substr(head, RSTART + 9, RLENGTH - 9)
    if (lastTag(doc) != "")
        defaultTag[className[classes]] = lastTag(doc)
}

# one whole declaration, without its comment
function declare(text,    name, before, kind, current, isVirtual) {
    current = classes ? className[classes] : ""
    if (current == "HStatus" || (classes && access[classes] == "private"))
        return
    if (classes && access[classes] == "protected" && current !~ /^HPx/)
        return # a plug-in derives from the HPx... classes only
    if (text ~ /^ *(using|typedef|friend|static_assert|enum|namespace|extern|#)/ || text !~ /\(/)
        return
    sub(/^ *template <[^>]*> */, "", text)
    before = text
    sub(/\(.*/, "", before)
    if (before ~ /operator|~|=/)
        return
    isVirtual = before ~ /(^| )virtual / || text ~ /\) (const )?override/
    name = before
    sub(/.*[ *&]/, "", name)
    if (name == "")
        return
    kind = "plain"
    if (before ~ /(^| )HStatus +[A-Za-z0-9_]+$/ || text ~ /HStatus *[*&] *status/)
        kind = "fails"
    else if (name == current)
        return
    else if (text ~ /\{/ || before ~ /(^| )(inline|constexpr) /)
        kind = "inline"
    if (isVirtual && (current ~ /^HPx/ || current ~ /RegistrationInfo$/))
        kind = "plugin"
    found[++functions] = current "\t" name "\t" kind
    tagOf[functions] = lineTag != "" ? lineTag : paragraphTag
    header[functions] = FILENAME
    sub(/.*openquarn\//, "openquarn/", header[functions])
}

FNR == 1 {
    depth = classes = 0
    doc = paragraphTag = statement = ""
}

{
    line = $0
    sub(/^ +/, "", line)
}

statement == "" && line ~ /^\/\// {
    if (!inDoc)
        doc = ""
    inDoc = 1
    doc = doc " " line
    next
}

line == "" || line ~ /^#/ {
    doc = paragraphTag = ""
    inDoc = 0
    next
}

{
    if (inDoc && lastTag(doc) != "")
        paragraphTag = lastTag(doc)
    inDoc = 0
    comment = line
    if (!sub(/.*\/\//, "", comment))
        comment = ""
    sub(/ *\/\/.*/, "", line)
    if (lastTag(comment) != "")
        lineTag = lastTag(comment)
}

line ~ /^template <[^>]*>$/ {
    next
}

line ~ /^(public|protected|private):$/ {
    access[classes] = line
    sub(/:/, "", access[classes])
    doc = paragraphTag = lineTag = ""
    next
}

{
    # inside of a body, or of something else that is no class
    opened = count(line, "{")
    closed = count(line, "}")
    inside = classes ? classDepth[classes] + 1 : 0
    if (depth > inside) {
        depth += opened - closed
        if (depth <= inside)
            statement = lineTag = ""
        while (classes && depth <= classDepth[classes])
            --classes
        next
    }
    isStruct = line ~ /^(template <[^>]*> )?struct /
    if (statement == "" && line ~ /^(template <[^>]*> )?(class|struct) .*\{$/) {
        head = line
        sub(/^(template <[^>]*> )?(class|struct) +/, "", head)
        sub(/^OPENQUARN_API +/, "", head)
        enterClass(head)
        ++depth
        doc = paragraphTag = lineTag = ""
        next
    }
    if (line ~ /^namespace .*\{$/ || line ~ /^\};?( |$)/ || line == "}") {
        # names in a namespace are no part of a class: what is in it is skipped as a body is
        depth += opened - closed
        while (classes && depth <= classDepth[classes])
            --classes
        statement = lineTag = ""
        next
    }
    statement = statement (statement == "" ? "" : " ") line
    depth += opened - closed
    if (line ~ /[;{}]$/) {
        declare(statement)
        if (depth <= inside)
            statement = ""
        lineTag = ""
    }
}

function inherits(class, base) {
    for (; class != ""; class = baseOf[class])
        if (class == base)
            return 1
    return 0
}

END {
    for (i = 1; i <= functions; ++i) {
        split(found[i], parts, "\t")
        if (parts[3] == "fails" && parts[1] == parts[2] && inherits(parts[1], "HFnBase"))
            parts[3] = "attach"
        tag = tagOf[i]
        for (class = parts[1]; tag == "" && class != ""; class = baseOf[class])
            tag = defaultTag[class]
        print parts[1] "\t" parts[2] "\t" parts[3] "\t" (tag == "" ? "-" : tag) "\t" header[i]
    }
}
