# Writes the gallery of the demo. Each line of its input has, separated by tabs: the name of a page, a title, the command that wrote
# it, its time, and its peak memory.

BEGIN {
    FS = "\t"
    print "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">"
    print "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; img-src 'self' file:; style-src 'unsafe-inline'\">"
    print "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n<title>Modeling: gallery</title>\n<style>"
    print ":root { color-scheme: light dark; --line: #8884; --soft: #6b7480; }"
    print "@media (prefers-color-scheme: dark) { :root { --soft: #a5afba; } }"
    print "body { max-width: 1600px; margin: 0 auto; padding: 24px clamp(10px, 2vw, 28px); font: 15px/1.5 system-ui, sans-serif; }"
    print "h1 { font-size: 24px; margin: 0 0 4px; } h2 { font-size: 16px; margin: 0; } p { color: var(--soft); margin: 0 0 18px; }"
    print "main { display: grid; gap: 16px; grid-template-columns: repeat(auto-fill, minmax(min(100%, 460px), 1fr)); }"
    print "a.card { display: block; border: 1px solid var(--line); border-radius: 10px; overflow: hidden; color: inherit; text-decoration: none; }"
    print "a.card:hover, a.card:focus-visible { border-color: #2a5d8f; outline: none; box-shadow: 0 2px 14px #0002; }"
    print ".pictures { display: grid; grid-template-columns: 1fr 1fr; gap: 1px; background: #e8ebef; } img { display: block; width: 100%; }"
    print ".text { padding: 12px 16px; } code { display: block; margin: 6px 0; font-size: 13px; overflow-wrap: anywhere; }"
    print ".times { color: var(--soft); font-size: 13px; font-variant-numeric: tabular-nums; }"
    print "@media print { a.card { break-inside: avoid; } }\n</style>\n</head>\n<body>\n<h1>What the operations do</h1>"
    print "<p>Each card opens a page that shows the models before and after, to be turned and measured. No server or network is needed.</p>\n<main>"
}

function escaped(text) {
    gsub(/&/, "\\&amp;", text); gsub(/</, "\\&lt;", text); gsub(/>/, "\\&gt;", text); gsub(/"/, "\\&quot;", text)
    return text
}

{
    printf "<a class=\"card\" href=\"%s.html\">", $1
    printf "<div class=\"pictures\"><img src=\"pictures/%s-before.png\" alt=\"before\" loading=\"lazy\">", $1
    printf "<img src=\"pictures/%s-after.png\" alt=\"after\" loading=\"lazy\"></div>", $1
    printf "<div class=\"text\"><h2>%s</h2><code>%s</code>", escaped($2), escaped($3)
    printf "<span class=\"times\">%s, peak memory %s</span></div></a>\n", escaped($4), escaped($5)
}

END { print "</main>\n</body>\n</html>" }
