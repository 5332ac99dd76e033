"""check.py FOLDER: every link in the pages of FOLDER leads to a file and, where it has one, to an anchor; nothing is
loaded from elsewhere. Prints what fails and ends with 1."""
import pathlib
import re
import sys
import urllib.parse
from html.parser import HTMLParser


class Page(HTMLParser):
    def __init__(self, path):
        super().__init__()
        self.anchors = {""}
        self.links = []  # (address, whether it is loaded with the page)
        self.feed(path.read_text(encoding="utf-8"))

    def handle_starttag(self, tag, attributes):
        values = dict(attributes)
        self.anchors.update(values[name] for name in ("id", "name") if values.get(name))
        for name in ("href", "src", "srcset", "data", "action", "poster"):
            if values.get(name) is not None:
                self.links.append((values[name], tag not in ("a", "area") or name != "href"))


folder = pathlib.Path(sys.argv[1]).resolve()
pages = {path: Page(path) for path in folder.rglob("*.html")}
faults = []
for path, page in pages.items():
    for link, is_loaded in page.links:
        address = urllib.parse.urlsplit(link)
        if address.scheme or address.netloc:
            if is_loaded and address.scheme != "data":
                faults.append(f"{path}: loads {link}")
            continue
        target = (path.parent / urllib.parse.unquote(address.path)).resolve() if address.path else path
        if not target.is_file():
            faults.append(f"{path}: the link {link} leads nowhere")
        elif target in pages and urllib.parse.unquote(address.fragment) not in pages[target].anchors:
            faults.append(f"{path}: the link {link} leads to no anchor")
for path in folder.rglob("*.css"):
    for found in re.finditer(r"(?:url\(|@import)\s*['\"]?(?!data:|url\()([^'\")\s]+)", path.read_text(encoding="utf-8")):
        if not (path.parent / found.group(1)).is_file() or found.group(1).startswith("/"):
            faults.append(f"{path}: loads {found.group(1)}")
for path in folder.rglob("*.js"):
    for found in re.finditer(r"^\s*import\s.*", path.read_text(encoding="utf-8"), re.M):
        faults.append(f"{path}: {found.group(0)}")
if not pages:
    faults.append(f"no page in {folder}")
print("\n".join(faults) or f"{len(pages)} pages, {sum(len(page.links) for page in pages.values())} links")
sys.exit(bool(faults))
