# Doxygen input filter for the public headers, whose comments are plain `//` comments: it turns them
# into documentation without changing the headers.
#
#   - the `//` lines directly above a declaration (a member, a class, a function, a macro) become
#     `///` lines, which document it;
#   - a `// ...` comment after a member or enumerator that ends in `;` or `,` becomes `///< ...`;
#   - the first comment of the file, when no declaration follows it directly, documents the file;
#   - a section ruler among public declarations, `// ---- Title ----`, starts a member group of that
#     name, which lasts until the next ruler, access label or the end of the class or namespace;
#   - comments inside function bodies, section rulers followed by a blank line, and comments above
#     access labels or namespaces stay plain.
#
# Outside `code spans` and "quoted text" (which Doxygen shows as written), characters that it would
# read as commands or tags are escaped, so the text reads as written. Lines are added only for the
# file's `@file` command and for the commands that open and close member groups.

function escape_text(text,    i, c, out, quote) {
  out = ""
  quote = ""
  for (i = 1; i <= length(text); i++) {
    c = substr(text, i, 1)
    if (quote != "") {
      if (c == quote) quote = ""
    } else if (c == "`" || c == "\"") {
      quote = c
    } else if (c ~ /[\\@<>#%&]/) {
      c = "\\" c
    }
    out = out c
  }
  return out
}

# `// text` with its indentation -> `/// text` (or `prefix text`), escaped.
function as_doc(line, marker,    indent, text) {
  match(line, /^[ \t]*/)
  indent = substr(line, 1, RLENGTH)
  text = substr(line, RLENGTH + 3)
  return indent marker escape_text(text)
}

function is_declaration(line) {
  if (line ~ /^[ \t]*$/) return 0
  if (line ~ /^[ \t]*#/) return line ~ /^[ \t]*#[ \t]*define[ \t]/
  if (line ~ /^[ \t]*(public|private|protected)[ \t]*:/) return 0
  if (line ~ /^[ \t]*(namespace|}|using namespace)/) return 0
  return 1
}

function close_group() {
  if (!group[depth]) return
  print "///@}"
  group[depth] = 0
}

# `// ---- Title ------` alone, among declarations, opens a group.
function is_ruler(pending_count, next_line) {
  return pending_count == 1 && scope[depth] == "decl" && !hidden[depth] && next_line ~ /^[ \t]*$/ &&
         buffer[1] ~ /^[ \t]*\/\/ -+ .*[^ -].* -+$/
}

function open_group(line,    title) {
  close_group()
  title = line
  sub(/^[ \t]*\/\/ -+ /, "", title)
  sub(/ -+$/, "", title)
  print "/// @name " escape_text(title)
  print "///@{"
  group[depth] = 1
}

function flush(next_line,    i, file_doc) {
  if (pending == 0) return
  if (is_ruler(pending, next_line)) {
    open_group(buffer[1])
    pending = 0
    return
  }
  file_doc = !seen_code && !file_documented && !is_declaration(next_line)
  if (file_doc) print "/// @file"
  for (i = 1; i <= pending; i++) {
    if (file_doc)
      print as_doc(buffer[i], "///")
    else if (scope[depth] == "decl" && is_declaration(next_line))
      print as_doc(buffer[i], "///")
    else
      print buffer[i]
  }
  if (file_doc) file_documented = 1
  pending = 0
}

# Where the line's trailing `//` comment starts (0 for none), with strings and characters skipped.
function comment_start(line,    i, c, quote) {
  quote = ""
  for (i = 1; i < length(line); i++) {
    c = substr(line, i, 1)
    if (quote != "") {
      if (c == "\\") i++
      else if (c == quote) quote = ""
    } else if (c == "\"" || c == "'") {
      quote = c
    } else if (substr(line, i, 2) == "//") {
      return i
    }
  }
  return 0
}

# The code of a line without strings, characters and its trailing comment.
function code_of(line,    start) {
  start = comment_start(line)
  if (start) line = substr(line, 1, start - 1)
  gsub(/\\./, "", line)
  gsub(/"[^"]*"/, "\"\"", line)
  gsub(/'[^']*'/, "''", line)
  return line
}

# Does the text since the last statement open a scope of declarations?
function opens_declarations(head) {
  while (head ~ /<[^<>]*>/) gsub(/<[^<>]*>/, "", head)
  return head ~ /(^|[^A-Za-z0-9_])(class|struct|union|enum|namespace)([^A-Za-z0-9_]|$)/ ||
         head ~ /extern[ \t]*""/
}

function track_braces(code,    i, c) {
  for (i = 1; i <= length(code); i++) {
    c = substr(code, i, 1)
    if (c == "{") {
      scope[++depth] = opens_declarations(head) ? "decl" : "body"
      group[depth] = 0
      hidden[depth] = 0
      head = ""
    } else if (c == "}") {
      if (depth > 0) depth--
      head = ""
    } else if (c == ";") {
      head = ""
    } else {
      head = head c
    }
  }
  head = head " "
}

BEGIN { depth = 0; scope[0] = "decl"; group[0] = 0; pending = 0; head = ""; in_macro = 0 }

in_macro {
  print
  in_macro = $0 ~ /\\$/
  next
}

/^[ \t]*\/\/([^\/!]|$)/ {
  buffer[++pending] = $0
  next
}

{
  flush($0)
  line = $0
  if (line ~ /^[ \t]*#/) {
    in_macro = line ~ /\\$/
    if (line ~ /^[ \t]*#[ \t]*define/) seen_code = 1
    print line
    next
  }
  if (line !~ /^[ \t]*$/) seen_code = 1
  if (line ~ /^[ \t]*}/) close_group()
  if (scope[depth] == "decl" && line ~ /^[ \t]*(public|private|protected)[ \t]*:/) {
    close_group()
    hidden[depth] = line !~ /public/
  }
  start = comment_start(line)
  if (scope[depth] == "decl" && start && substr(line, 1, start - 1) ~ /[;,][ \t]*$/) {
    text = substr(line, start + 2)
    sub(/^ /, "", text)
    line = substr(line, 1, start - 1) "///< " escape_text(text)
  }
  print line
  track_braces(code_of($0))
}

END {
  flush("")
  close_group()
}
