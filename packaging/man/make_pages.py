#!/usr/bin/env python3
"""Makes the manual pages from the documents and from the program's own help, so that nothing is said twice.

usage: make_pages.py PROGRAM FOLDER      pages in FOLDER/man1, man5 and man7; needs lowdown and help2man

A document's first heading goes, its other headings go up by one level, a link to another page becomes its name,
one to another document its place, any other its text, and a table of more columns than a terminal holds becomes a list. Of each command that PROGRAM
lists there is a page, made of what the command says with --help; so there is of ipmisel-simulator beside it. A list of
the commands and the references from page to page are made here.
"""
import email.utils
import pathlib
import re
import subprocess
import sys

PACKAGING = pathlib.Path(__file__).resolve().parents[1]
DOCS = pathlib.Path(__file__).resolve().parents[2] / "docs"
# Document, name of the page, section, and what whatis says.
DOCUMENTS = (
    ("manual.md", "ipmisel", 1, "reads what a server's management controller (BMC) knows"),
    ("simulated-server.md", "ipmisel-simulated-server", 5, "the file of a simulated server"),
    ("configuration.md", "ipmisel.conf", 5, "options and groups of hosts in a file"),
    ("severity-rules.md", "ipmisel-severity-rules", 5, "the file of the user's own severities"),
    ("fleet.md", "ipmisel-fleet", 7, "collecting from many controllers"),
    ("formats.md", "ipmisel-formats", 7, "the formats of a report, key by key"),
    ("store.md", "ipmisel-store", 7, "a database of what was collected"),
    ("capture.md", "ipmisel-capture", 5, "a capture of every exchange with a BMC"),
)
# Of a table: more columns, or a longer word in a cell, and it does not fit a terminal.
MAX_COLUMNS, MAX_WORD = 3, 24


def release_date():
    """Of the package's first entry: a page is the same in every build."""
    entry = re.search(r"^ -- .*>  (.*)$", (PACKAGING / "debian/changelog").read_text(), re.MULTILINE)
    return email.utils.parsedate_to_datetime(entry[1]).date().isoformat()


def run(*command, **options):
    return subprocess.run(command, check=True, text=True, stdout=subprocess.PIPE, **options).stdout


def cells(row):
    return [cell.strip() for cell in re.split(r"(?<!\\)\|", row.strip().strip("|"))]


def narrow(match):
    """A table as definitions of its first column, where it has one other or is too wide for a terminal."""
    head, _, *rows = match[0].rstrip("\n").split("\n")
    names = cells(head)
    if 2 < len(names) <= MAX_COLUMNS and max(map(len, match[0].split())) <= MAX_WORD:
        return match[0]
    listed = ""
    for row in map(cells, rows):
        facts = [f"{name}: {cell}" for name, cell in zip(names[1:], row[1:]) if cell]
        if len(names) == 2:
            facts = row[1:]
        listed += f"{row[0]}\n: {'; '.join(facts)}\n\n"
    return listed


def reference(match):
    """What a link is on a page."""
    text, document = match[1], match[2].split("#")[0]
    for name, page, section, _ in DOCUMENTS:
        if document == name and (DOCS / name).exists():
            return f"{page}({section})" if text == name else f"{text} ({page}({section}))"
    return f"share/doc/ipmisel/docs/{document}" if text == document else text


def markdown_of_page(text, name, what):
    """What lowdown is handed: the document as a page."""
    lines, in_code = [], False
    for line in text.split("\n")[1:]:
        if line.startswith("```"):
            in_code = not in_code
        elif not in_code and line.startswith("## "):
            line = line[1:].upper()
        elif not in_code and line.startswith("###"):
            line = line[1:]
        if not in_code and not line.startswith("    "):
            line = re.sub(r"\[([^\]]*)\]\((?!https?:)([^)]*)\)", reference, line)
        lines.append(line)
    rest = re.sub(r"^\|.*\n\| ?-.*\n(?:\|.*\n)*", narrow, "\n".join(lines) + "\n", flags=re.MULTILINE)
    return f"# NAME\n\n{name} - {what}\n\n# DESCRIPTION\n{rest}"


def document_page(path, name, section, what, version):
    metadata = [f"-Mtitle={name}", f"-Msection={section}", f"-Msource=ipmisel {version}", f"-Mdate={release_date()}"]
    page = run("lowdown", "-s", "-Tman", *metadata, input=markdown_of_page(path.read_text(), name, what))
    # The font of code has a name that every formatter knows.
    page = page.replace("\\fC", "\\f(CR")
    # whatis wants a heading on the line of its request, and no paragraph begins twice.
    page = re.sub(r"^\.(S[HS])\n", r".\1 ", page, flags=re.MULTILINE)
    page = re.sub(r"^(\.S[HS] (?!NAME).*)\n\.[LP]P\n", r"\1\n", page, flags=re.MULTILINE)
    # lowdown moves back up for what a definition says, which goes wrong at the end of a page.
    page = re.sub(r'^(?:\.[LP]P\n)?(.*)\n\.if n \\\n\.sp -1v\n\.if t \\\n\.sp -0\.25v\n\.IP "" 5n\n', r".TP 5n\n\1\n", page,
                  flags=re.MULTILINE)
    return page.replace(
        ".SH NAME\n.LP\n", ".ad l\n.SH NAME\n").replace(f"{name} - {what}", f"{name} \\- {what}", 1)


def commands(program):
    """Name and description of each command that the program lists."""
    listed = run(program, "--help").split("Subcommands:\n")[1]
    return re.findall(r"^  (\w[\w-]*) +(\S.*)$", listed, re.MULTILINE)


def with_commands(page, listed):
    """The program's own page with a list of its commands before the first section of its document."""
    rows = "".join(f".TP\n\\fBipmisel {command}\\fR\n{what[0].lower() + what[1:]}\n" for command, what in listed)
    before, section, after = re.split(r"^(\.SH (?!NAME|DESCRIPTION).*\n)", page, 1, re.MULTILINE)
    return f"{before}.SH COMMANDS\n{rows}{section}{after}"


def with_references(pages):
    """Each page names the others: those of the commands the program's, which names them all."""
    def reference(page):
        name, section = page.rsplit(".", 1)
        return f"\\fB{name}\\fR({section})".replace("-", "\\-")
    order = sorted(pages, key=lambda page: (page[-1], page))
    for page, text in pages.items():
        is_command = page.endswith(".1") and page != "ipmisel.1"
        others = ["ipmisel.1"] if is_command else [other for other in order if other != page]
        yield page, f"{text.rstrip()}\n.SH SEE ALSO\n{', '.join(map(reference, others))}\n"


def command_page(program, command, what, version):
    what = what[0].lower() + what[1:]
    page = run("help2man", "-N", "--no-discard-stderr", "-n", what, f"--version-string={version}",
               f"{program} {command}")
    # help2man has no word for the command of a program.
    page = re.sub(r"^\.TH .*$", f'.TH ipmisel\\\\-{command} 1 "{release_date()}" "ipmisel {version}"', page, 1, re.MULTILINE)
    return page.replace(f"ipmisel {command} \\-", f"ipmisel\\-{command} \\-", 1)


def simulator_page(simulator, version):
    page = run("help2man", "-N", "--no-discard-stderr", "-n", "simulated management controllers (BMC) behind network ports",
               f"--version-string={version}", simulator)
    return re.sub(r"^\.TH .*$", f'.TH ipmisel\\-simulator 1 "{release_date()}" "ipmisel {version}"', page, 1, re.MULTILINE)


def main():
    program, folder = sys.argv[1], pathlib.Path(sys.argv[2])
    version = run(program, "--version").split()[-1]
    pages = {}
    for document, name, section, what in DOCUMENTS:
        if (DOCS / document).exists():
            pages[f"{name}.{section}"] = document_page(DOCS / document, name, section, what, version)
    listed = commands(program)
    pages["ipmisel.1"] = with_commands(pages["ipmisel.1"], listed)
    for command, what in listed:
        pages[f"ipmisel-{command}.1"] = command_page(program, command, what, version)
    simulator = pathlib.Path(program).with_name("ipmisel-simulator")
    if simulator.exists():  # a build without access over the network has none
        pages["ipmisel-simulator.1"] = simulator_page(simulator, version)
    for name, page in with_references(pages):
        place = folder / f"man{name[-1]}" / name
        place.parent.mkdir(parents=True, exist_ok=True)
        place.write_text(page)


if __name__ == "__main__":
    main()
