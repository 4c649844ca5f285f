"""Links of Markdown documents."""

import re


def anchors_of(text):
    """The names by which a document's headings are linked."""
    headings = re.findall(r"^#+ (.*)$", text, re.MULTILINE)
    return {re.sub(r"[^\w -]", "", heading.lower()).replace(" ", "-") for heading in headings}


def prose_of(path):
    return re.sub(r"^```.*?^```$", "", path.read_text(), flags=re.DOTALL | re.MULTILINE)


def broken_links(documents):
    """The links to files or headings that are not there, as "document: link"."""
    broken = []
    for document in documents:
        for link in re.findall(r"\]\(([^)\s]+)\)", prose_of(document)):
            if re.match(r"https?://", link):
                continue
            name, _, anchor = link.partition("#")
            target = document.parent / name if name else document
            if not target.exists() or (anchor and anchor not in anchors_of(prose_of(target))):
                broken.append(f"{document.name}: {link}")
    return broken
