# awk -f pages.awk -v out=FOLDER -v template=vlsys.3.in -v date="November 25, 2026" vlsys.h
# Makes the pages of section 3 from the header: one page a section, named after its first operation,
# a link page under each further name, and vlsys.3 with the header's opening comment.
#
# What it relies on in the header:
# - The first comment is the overview. A section begins with "/* ---- Title ---- */"; one without an
#   operation has its page under its title, "vlsys_<title up to a comma>".
# - Comments and declarations begin at the left margin. A comment that an empty line follows is about
#   the section, any other about the declarations directly below it, up to the next empty line.
# - In a comment an empty line ends a paragraph, and so does a line that begins with "Returns" or
#   "Logs" after a full stop. "- " begins an item of a list, whose further lines are indented by two.
#   Other indented lines, and lines with two blanks in a row, are shown as they stand; when one of
#   them ends in ";" they are a list, whose items end in ";" or ".". Two blanks part an item's value
#   from what is said of it. `x` is an argument or a field.
# - Declarations are #define (with a comment behind its value), typedef struct or enum, and VLSYS_API.
# Anything else in a section ends the script with status 1, so that no text is lost in silence.

function fail(text) {
    printf "%s:%d: %s\n", FILENAME, FNR, text >"/dev/stderr"
    failed = 1
    exit 1
}

# ---- Text of a page

function words(text) { # as mdoc text: no character of it is taken for a request
    gsub(/\\/, "\\e", text)
    gsub(/ -/, " \\-", text)
    sub(/^-/, "\\-", text)
    while (match(text, /`[^`]+`/))
        text = substr(text, 1, RSTART - 1) "\\fI" substr(text, RSTART + 1, RLENGTH - 2) "\\fP" \
            substr(text, RSTART + RLENGTH)
    return text ~ /^[.']/ ? "\\&" text : text
}

function argument(text) { # as one argument of a request
    text = words(text)
    gsub(/"/, "\\(dq", text)
    return "\"" text "\""
}

function sentences(text,    all, end, quoted, quotes) { # of running text, each on a line of its own
    while (match(text, /[A-Za-z0-9)">][.] [A-Z]/)) {
        end = RSTART + 1
        all = all words(substr(text, 1, end))
        quoted = substr(text, 1, end)
        quotes += gsub(/"/, "", quoted)
        all = all (quotes % 2 ? "\\& " : "\n")
        text = substr(text, end + 2)
    }
    return all words(text)
}

function put(line) { body = body line "\n" }

function trim(text) {
    sub(/^ +/, "", text)
    sub(/ +$/, "", text)
    return text
}

function paragraph(text) {
    if (text == "")
        return
    if (!fresh)
        put(".Pp")
    put(sentences(text))
    fresh = 0
}

function heading(text) {
    put(".Ss " argument(text))
    fresh = 1
    headed = 1
}

function begin_display(request) {
    put(request)
    fresh = 1
}

function end_display(request) {
    put(request)
    fresh = 0
}

function shown(first, last,    i, width, text, tag, begins) { # lines of a comment that are no paragraph
    for (i = first; i <= last && line[i] !~ /;$/; i++)
        ;
    if (i > last) {
        begin_display(".Bd -literal -offset indent")
        for (i = first; i <= last; i++)
            put(words(line[i]))
        end_display(".Ed")
        return
    }
    for (i = first; i <= last; i++)
        if (match(trim(line[i]), /[^ ]  /) && RSTART > width)
            width = RSTART
    begin_display(width ? ".Bl -tag -width " width + 1 "n -compact" : ".Bl -dash -compact")
    begins = 1
    for (i = first; i <= last; i++) {
        text = trim(line[i])
        if (begins && width) {
            match(text, /   */)
            tag = RSTART ? substr(text, 1, RSTART - 1) : text
            text = RSTART ? trim(substr(text, RSTART)) : ""
            put(".It " argument(tag))
        } else if (begins)
            put(".It")
        if (text != "")
            put(sentences(text))
        begins = text ~ /[;.]$/
    }
    end_display(".El")
}

function is_shown(text) { return text ~ /^  / || text ~ /[^ ]  / }

function describe(    i, first, text) { # the comment line[1] to line[lines]
    text = ""
    for (i = 1; i <= lines; i++) {
        if (line[i] == "" || line[i] ~ /^- / || is_shown(line[i]) ||
            (line[i] ~ /^(Returns|Logs)/ && line[i - 1] ~ /[.]$/)) {
            paragraph(text)
            text = ""
        }
        if (line[i] ~ /^- /) {
            begin_display(".Bl -dash")
            while (i <= lines && line[i] ~ /^- /) {
                text = substr(line[i++], 3)
                while (i <= lines && line[i] ~ /^  /)
                    text = text " " trim(line[i++])
                put(".It")
                put(sentences(text))
            }
            end_display(".El")
            text = ""
            i--
        } else if (is_shown(line[i])) {
            first = i
            while (i < lines && is_shown(line[i + 1]))
                i++
            shown(first, i)
        } else if (line[i] != "")
            text = text (text == "" ? "" : " ") line[i]
    }
    paragraph(text)
    lines = 0
}

function list_terms(    i, width) { # constants or fields with what is said of them
    for (i = 1; i <= terms; i++)
        if (length(term[i]) > width)
            width = length(term[i])
    if (body ~ /[.]El\n$/)
        put(".Pp")
    begin_display(".Bl -tag -width " (width > 34 ? 34 : width) "n -compact")
    for (i = 1; i <= terms; i++) {
        put(".It " argument(term[i]))
        if (said[i] != "")
            put(sentences(said[i]))
    }
    end_display(".El")
    terms = 0
}

# ---- Declarations

function add_term(text,    at, comment) { # "code /* what is said */"
    at = index(text, "/*")
    if (at) {
        comment = trim(substr(text, at + 2))
        sub(/ *\*\/$/, "", comment)
        text = substr(text, 1, at - 1)
    }
    term[++terms] = trim(text)
    said[terms] = comment
}

function whole_line(    text, more) { # with what a backslash or an open comment continues
    text = $0
    while (text ~ /\\$/ || (index(text, "/*") && !index(text, "*/"))) {
        if ((getline more) <= 0)
            fail("ends within a declaration")
        sub(/ *\\$/, "", text)
        text = text " " trim(more)
    }
    return text
}

function add_operation(text,    name, at, depth, begin, c) {
    while (text !~ /;$/) {
        if ((getline) <= 0)
            fail("ends within a declaration")
        text = text " " trim($0)
    }
    if (!match(text, /vlsys_[a-z0-9_]+\(/))
        fail("no operation's name")
    name = substr(text, RSTART, RLENGTH - 1)
    begin = at = RSTART + RLENGTH
    operation[++operations] = name
    synopsis = synopsis ".Ft " argument(trim(substr(text, 11, RSTART - 11))) "\n.Fo " name "\n"
    for (depth = 1; depth && at <= length(text); at++) {
        c = substr(text, at, 1)
        depth += (c == "(") - (c == ")")
        if ((c == "," && depth == 1) || !depth) {
            synopsis = synopsis ".Fa " argument(trim(substr(text, begin, at - begin))) "\n"
            begin = at + 1
        }
    }
    synopsis = synopsis ".Fc\n"
    add_name(name)
}

function add_name(text) { name[++names] = text }

function add_record(    text) {
    match($0, /vlsys_[a-z0-9_]+/)
    record = record (record == "" ? "" : ", ") substr($0, RSTART, RLENGTH)
    add_name(substr($0, RSTART, RLENGTH))
    while ((getline) > 0 && $0 !~ /^}/)
        add_term(whole_line())
}

function common_beginning(    i, text) {
    text = constant[1]
    for (i = 2; i <= constants; i++)
        while (text != "" && index(constant[i], text) != 1)
            text = substr(text, 1, length(text) - 1)
    return constants > 1 ? text "*" : text
}

function end_group(    i, text) { # of a comment and the declarations below it
    for (i = 1; i <= operations; i++)
        text = text (i > 1 ? ", " : "") operation[i]
    if (text != "" || record != "")
        heading(text != "" ? text : record)
    else if (headed && (constants || lines))
        heading(constants ? common_beginning() : "What follows")
    if (lines)
        describe()
    if (terms)
        list_terms()
    operations = constants = 0
    record = ""
}

# ---- Pages

function head(page, names, about,    file) {
    file = out "/" page ".3"
    printf ".Dd %s\n.Dt %s 3\n.Os vlsys\n.Sh NAME\n%s.Nd %s\n", date, toupper(page), names, about >file
    return file
}

function end_section(    page, file, i, about, list) {
    end_group()
    if (title == "")
        return
    about = title
    if (substr(title, 2, 1) ~ /[a-z]/)
        about = tolower(substr(title, 1, 1)) substr(title, 2)
    if (synopsis == "") { # records and constants alone
        page = tolower(title)
        sub(/,.*/, "", page)
        gsub(/[^a-z0-9]+/, "_", page)
        for (i = ++names; i > 1; i--)
            name[i] = name[i - 1]
        name[1] = "vlsys_" page
    }
    page = name[1]
    for (i = 1; i <= names; i++) {
        list = list ".Nm " name[i] (i < names ? " ,\n" : "\n")
        if (i > 1) {
            printf ".so man3/%s.3\n", page >(out "/" name[i] ".3")
            close(out "/" name[i] ".3")
        }
    }
    file = head(page, list, about)
    printf ".Sh LIBRARY\nlibvlsys (-lvlsys)\n.Sh SYNOPSIS\n.In vlsys.h\n%s", synopsis >file
    printf ".Sh DESCRIPTION\n%s.Sh SEE ALSO\n.Xr vlsys 3\n", body >file
    close(file)

    contents = contents ".It Xr " page " 3\n" words(title) (names > 1 ? ":" : ".") "\n"
    for (i = 2; i <= names; i++)
        contents = contents ".Xr " name[i] " 3" (i < names ? " ," : " .") "\n"
}

function begin_section(text) {
    sub(/^\/\* ---- /, "", text)
    sub(/ -+ \*\/$/, "", text)
    title = text
    body = synopsis = ""
    names = headed = 0
    fresh = 1
}

function add_comment(    text) {
    text = $0
    sub(/^\/\* ?/, "", text)
    for (;;) {
        if (match(text, / *\*\//)) {
            if (RSTART > 1)
                line[++lines] = substr(text, 1, RSTART - 1)
            return
        }
        if (text != "" || lines)
            line[++lines] = text
        if ((getline text) <= 0)
            fail("ends within a comment")
        if (text !~ /^ \*\//)
            sub(/^ \*/, "", text)
        sub(/^ /, "", text)
    }
}

BEGIN { fresh = 1 }
/^\/\* ---- .* -+ \*\/$/ {
    end_section()
    begin_section($0)
    next
}
/^\/\*/ {
    if (title == "" && overview != "")
        fail("a second comment before the first section")
    if (operations || constants || record != "")
        end_group()
    add_comment()
    if (title == "") {
        describe()
        overview = body
    }
    next
}
title == "" || /^#(if|ifdef|ifndef|else|endif)/ || /^extern "C"/ || /^}$/ { next }
/^$/ {
    end_group()
    next
}
/^#define / {
    constant[++constants] = $2
    sub(/\(.*/, "", constant[constants])
    text = whole_line()
    sub(/^#define /, "", text)
    add_term(text)
    next
}
/^typedef (struct|enum) vlsys_[a-z0-9_]+ [{]$/ {
    add_record()
    next
}
/^VLSYS_API / {
    add_operation($0)
    next
}
{ fail("neither comment nor declaration: " $0) }

END {
    if (failed)
        exit 1
    end_section()
    while ((getline text <template) > 0) {
        if (text == "@overview@")
            printf "%s", overview >(out "/vlsys.3")
        else if (text == "@contents@")
            printf "%s", contents >(out "/vlsys.3")
        else {
            sub(/@date@/, date, text)
            print text >(out "/vlsys.3")
        }
    }
}
