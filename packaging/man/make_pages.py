#!/usr/bin/env python3
"""Makes the manual pages from the documents and from the program's own help, so that nothing is said twice.

usage: make_pages.py PROGRAM FOLDER      pages in FOLDER/man1, man5 and man7; needs lowdown and help2man

A document's first heading goes, its other headings go up by one level, links become their text. Of each
command that PROGRAM lists there is a page, made of what the command says with --help.
"""
import pathlib
import re
import subprocess
import sys

DOCS = pathlib.Path(__file__).resolve().parents[2] / "docs"
# Document, name of the page, section, and what whatis says.
DOCUMENTS = (
    ("manual.md", "ipmisel", 1, "reads what a server's management controller (BMC) knows"),
    ("simulated-server.md", "ipmisel-simulated-server", 5, "the file of a simulated server"),
    ("configuration.md", "ipmisel.conf", 5, "options and groups of hosts in a file"),
    ("severity-rules.md", "ipmisel-severity-rules", 5, "the file of the user's own severities"),
    ("fleet.md", "ipmisel-fleet", 7, "collecting from many controllers"),
    ("capture.md", "ipmisel-capture", 5, "a capture of every exchange with a BMC"),
)


def run(*command, **options):
    return subprocess.run(command, check=True, text=True, stdout=subprocess.PIPE, **options).stdout


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
        lines.append(line)
    # A link to another document leads nowhere from a page.
    rest = re.sub(r"\[([^\]]*)\]\((?!https?:)[^)]*\)", r"\1", "\n".join(lines))
    return f"# NAME\n\n{name} - {what}\n\n# DESCRIPTION\n{rest}"


def document_page(path, name, section, what, version):
    # Without a date of its own the page is the same in every build.
    metadata = [f"-Mtitle={name}", f"-Msection={section}", f"-Msource=ipmisel {version}", "-Mdate="]
    page = run("lowdown", "-s", "-Tman", *metadata, input=markdown_of_page(path.read_text(), name, what))
    # whatis wants a heading on the line of its request.
    return re.sub(r"^\.(S[HS])\n", r".\1 ", page, flags=re.MULTILINE).replace(
        ".SH NAME\n.LP\n", ".ad l\n.SH NAME\n").replace(f"{name} - {what}", f"{name} \\- {what}", 1)


def commands(program):
    """Name and description of each command that the program lists."""
    listed = run(program, "--help").split("Subcommands:\n")[1]
    return re.findall(r"^  (\w[\w-]*) +(\S.*)$", listed, re.MULTILINE)


def command_page(program, command, what, version):
    what = what[0].lower() + what[1:]
    page = run("help2man", "-N", "--no-discard-stderr", "-n", what, f"--version-string={version}",
               f"{program} {command}")
    # help2man has no word for the command of a program.
    page = re.sub(r"^\.TH .*$", f'.TH ipmisel\\\\-{command} 1 "" "ipmisel {version}"', page, 1, re.MULTILINE)
    return page.replace(f"ipmisel {command} \\-", f"ipmisel\\-{command} \\-", 1)


def main():
    program, folder = sys.argv[1], pathlib.Path(sys.argv[2])
    version = run(program, "--version").split()[-1]
    pages = {}
    for document, name, section, what in DOCUMENTS:
        if (DOCS / document).exists():
            pages[f"{name}.{section}"] = document_page(DOCS / document, name, section, what, version)
    for command, what in commands(program):
        pages[f"ipmisel-{command}.1"] = command_page(program, command, what, version)
    for name, page in pages.items():
        place = folder / f"man{name[-1]}" / name
        place.parent.mkdir(parents=True, exist_ok=True)
        place.write_text(page)


if __name__ == "__main__":
    main()
