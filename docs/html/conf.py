"""How Sphinx renders the manual: see scripts/site, which starts it in a folder with links to the pages.

The Markdown of the pages is for reading as it is. What only HTML can do is added here: the order of the pages, an anchor
for every keyword of the setup reference, links from keywords in the text to it, and back to the pages about them.
"""
import pathlib
import re

from docutils import nodes
from pygments.lexer import RegexLexer, bygroups
from pygments import token
from sphinx import addnodes
from sphinx.domains import Domain, ObjType

project = "Mirevo"
html_title = "Mirevo"
copyright = ""
root_doc = "index"
extensions = ["myst_parser"]
include_patterns = ["index.md", "*.md", "docs/**", "examples/**"]
myst_heading_anchors = 4
myst_enable_extensions = []
smartquotes = False
# The colours of awk do not know all of awk; such a block is shown without.
suppress_warnings = ["misc.highlighting_failure"]

html_theme = "furo"
html_show_copyright = False
html_show_sphinx = False
html_copy_source = False
html_show_search_summary = False  # it would load pages by a script, which a browser refuses from disk
html_show_sourcelink = False
html_search_scorer = str(pathlib.Path(__file__).with_name("scorer.js"))
html_static_path = ["static"]
html_css_files = ["mirevo.css"]
html_theme_options = {"navigation_with_keys": False}
pygments_style = "default"
pygments_dark_style = "native"

REFERENCE = "docs/setup-reference"
# Pages that mention keywords without explaining them.
NOT_EXPLAINING = ("index", "docs/README", "docs/tutorial", "docs/coming-from", "docs/troubleshooting", "docs/glossary",
                  "docs/architecture", "docs/examples/", "docs/algorithms/search-comparison", "docs/algorithms/which-search",
                  "examples/", "CHANGELOG",
                  "CONTRIBUTING", REFERENCE)
# The pages that sections and keywords have of their own. Other pages that explain a keyword are found by its mentions.
MODEL_FOLDER = "docs/file-formats#where-the-model-is-kept-and-where-it-runs"
SECTION_PAGES = {
    "SIMBATCH": MODEL_FOLDER,
    "SIMPARAM": "docs/templates",
    "MODEL_PARAMETERS": "docs/algorithms/parameters",
    "INTERNAL_CONSTRAINTS": "docs/algorithms/parameters#internal-constraints",
    "ObjectiveFunctions": "docs/algorithms/output-measures",
    "SIMULATION_FILE": "docs/file-formats#time-series",
    "OBSERVATION_FILE": "docs/file-formats#time-series",
    "OUTPUT_MEASURE_FILE": "docs/algorithms/output-measures#measures-that-the-model-computes-itself",
    "OBJECTIVE_FUNCTIONS": "docs/algorithms/output-measures#the-aggregate",
    "SAVE_OUTPUT_FILES": "docs/file-formats#results",
    "SCENARIOS": "docs/scenarios",
    "SENSITIVITY_ANALYSIS": "docs/sensitivity",
    "OPTIMISATION_ALGORITHM": "docs/algorithms/which-search",
    "SCE_CONTROL_PARAMETERS": "docs/algorithms/sce",
    "PSE_CONTROL_PARAMETERS": "docs/algorithms/pse",
    "DDS_CONTROL_PARAMETERS": "docs/algorithms/dds",
    "CMAES_CONTROL_PARAMETERS": "docs/algorithms/cma-es",
    "GLM_CONTROL_PARAMETERS": "docs/algorithms/glm",
    "INITIAL_SAMPLE": "docs/algorithms/initial-sample",
    "STOPPING_CRITERIA": "docs/algorithms/stopping",
    "SURROGATE_MODEL_PARAMETERS": "docs/algorithms/surrogate",
    "UNCERTAINTY_ESTIMATION": "docs/uncertainty",
    "SimultaneousSimulations": MODEL_FOLDER,
}
KEYWORD_PAGES = {
    "Option": "docs/README#tasks",
    "Algorithm_Type": "docs/algorithms/which-search",
    "Restart": "docs/restart",
    "FailedRunFolders": "docs/restart#models-that-fail",
    "Report": "docs/report",
    "MaxSimulationTime": "docs/restart#models-that-hang",
    "Random_Seed": "docs/algorithms/random-numbers",
    "TqSEKdxListItemCount": "docs/file-formats#kdx-setup-file",
    "Aggregation_Method": "docs/algorithms/output-measures#the-aggregate",
    "Minimum_Coverage": "docs/algorithms/output-measures#how-many-observations-a-run-meets",
    "Start_Date": "docs/file-formats#kdx-setup-file",
    "End_Date": "docs/file-formats#kdx-setup-file",
}
KEYWORD = re.compile(r"^([A-Za-z][A-Za-z0-9_]*)(?: *= *\S.*)?$")


class SetupLexer(RegexLexer):
    """The colours of a setup file."""

    name = "kdx"
    aliases = ["kdx"]
    tokens = {
        "root": [
            (r"//.*", token.Comment),
            (r"'[^'\n]*'|\"[^\"\n]*\"", token.String),
            (r"\[[^\]\n]*\]", token.Name.Tag),
            (r"([A-Za-z_]\w*)(\s*)(=)", bygroups(token.Name.Attribute, token.Text, token.Operator)),
            (r"[-+0-9][-+0-9.eEdD:T]*", token.Number),
            (r"\s+|.", token.Text),
        ]
    }


class Reference:
    """Sections and keywords, from the page that the program's own tables are written to."""

    def __init__(self, text):
        self.sections = {}  # name of a section -> its anchors
        self.keywords = {}  # name of a keyword -> [(path of its section, anchor)]
        path = None
        for line in text.splitlines():
            if line.startswith("## "):
                path = line[3:].strip()
                self.sections.setdefault(path.split("/")[-1], []).append(self.anchor(path))
            found = re.match(r"\| `(\w+)` \|", line)
            if found and path:
                name = found.group(1)
                self.keywords.setdefault(name, []).append((path, self.anchor(path, name)))

    @staticmethod
    def anchor(path, name=None):
        return "keyword-" + "-".join(path.split("/") + ([name] if name else []))


class SetupDomain(Domain):
    """Sections and keywords as objects of the search, which leads to their anchors."""

    name = "setup"

    def get_objects(self):
        reference = self.env.app.mirevo_reference
        found = [(name, "section", anchor) for name, anchors in reference.sections.items() for anchor in anchors]
        for name, choices in reference.keywords.items():
            found += [(name, "keyword of " + path, anchor) for path, anchor in choices]
        for name, kind, anchor in found:
            self.object_types.setdefault(kind, ObjType(kind))
            yield name, name, kind, REFERENCE, anchor, 1

    def resolve_any_xref(self, *_):
        return []  # links come from link_keywords()


def contents_of(manual):
    """[(caption, pages)] in the order of docs/README.md."""
    parts = []
    for line in manual.splitlines():
        if line.startswith("## "):
            parts.append((line[3:].strip(), []))
        found = re.match(r"- \[([^\]]*)\]\(([^)#]*)\.md\)", line)
        if found:
            parts[-1][1].append((found.group(1), "docs/" + found.group(2)))
    return parts


def read_source(app, name, source):
    """Adds the contents to the first page, and leads links to README.md, which is the first page here, to it."""
    source[0] = re.sub(r"\]\((\.\./)*README\.md(#[^)]*)?\)",
                       lambda link: link.group(0) if name.startswith("examples/") and not link.group(1) or
                       name == "docs/README" and not link.group(1) else link.group(0).replace("README", "index"),
                       source[0])
    if "/data/" in name:
        source[0] = "---\norphan: true\n---\n" + source[0]
    if name != root_doc:
        return
    parts = contents_of(pathlib.Path(app.srcdir, "docs/README.md").read_text(encoding="utf-8"))
    parts[0][1].insert(0, ("Manual", "docs/README"))
    parts[-1][1].extend([("Contributing", "CONTRIBUTING"), ("The examples", "examples/README"),
                         ("Changes", "CHANGELOG")])
    for caption, pages in parts:
        source[0] += f"\n```{{toctree}}\n:hidden:\n:caption: {caption}\n\n"
        source[0] += "".join(f"{title} <{page}>\n" for title, page in pages) + "```\n"


def section_of(node):
    while node is not None and not isinstance(node, nodes.section):
        node = node.parent
    return node


def anchor_reference(doctree):
    """Gives each section and each keyword of the setup reference its anchor."""
    for section in doctree.findall(nodes.section):
        path = section[0].astext()
        if path.split("/")[0].isidentifier():
            section["classes"].append("setup-section")
            section["ids"].append(Reference.anchor(path))
            for entry in section.findall(nodes.entry):
                entry["classes"] += [] if entry.astext() else ["empty"]
            for row in section.findall(nodes.row):
                literal = next(iter(row[0].findall(nodes.literal)), None)
                if literal is not None and section_of(row) is section:
                    row[0]["ids"].append(Reference.anchor(path, literal.astext()))


def anchor_for(literal, reference, doc):
    """The anchor of what a text in code style names, or None."""
    found = KEYWORD.match(literal.astext())
    name = found.group(1) if found else literal.astext().strip("[]")
    if name in reference.sections and not ("=" in literal.astext()):
        return reference.sections[name][0]
    choices = reference.keywords.get(name)
    if not choices:
        return None
    # Of several keywords of one name, the one whose section is named beside it, or else is the page's subject.
    context = literal.parent.astext()
    beside = [anchor for path, anchor in choices if any(part in context for part in path.split("/")[-2:] if "_" in part)]
    subject = {"uncertainty": "UNCERTAINTY", "sensitivity": "SENSITIVITY", "output-measures": "MEASURE_n"}
    about = [anchor for path, anchor in choices for word, part in subject.items() if word in doc and part in path]
    return (beside or about or [choices[0][1]])[0]


def link_keywords(app, doctree):
    """Links the first mention of each keyword in each section of a page to the reference."""
    doc = app.env.docname
    reference = app.mirevo_reference
    if doc == REFERENCE:
        anchor_reference(doctree)
        return
    if doc.startswith("CHANGELOG"):
        return
    seen = set()
    for literal in list(doctree.findall(nodes.literal)):
        parent = literal.parent
        if isinstance(parent, (nodes.reference, addnodes.pending_xref, nodes.title, addnodes.download_reference)):
            continue
        anchor = anchor_for(literal, reference, doc)
        section = section_of(literal)
        if anchor is None or (id(section), anchor) in seen:
            continue
        seen.add((id(section), anchor))
        link = nodes.reference("", "", literal.deepcopy(), internal=True, classes=["keyword"])
        link["mirevo_anchor"] = anchor
        parent.replace(literal, link)
        if not doc.startswith(NOT_EXPLAINING):
            heading = section["ids"][0] if section is not None and section.parent.parent is not None else None
            mentions = app.mirevo_mentions.setdefault(anchor, {}).setdefault(doc, [0, heading])
            in_title = section is not None and literal.astext() in section[0].astext()
            mentions[0] += 3 if in_title else 1


def resolve_links(app, doctree, doc):
    """Fills in where links to keywords lead, and adds to the reference the pages that explain each of them."""
    builder = app.builder
    for link in doctree.findall(nodes.reference):
        if "mirevo_anchor" in link:
            link["refuri"] = builder.get_relative_uri(doc, REFERENCE) + "#" + link["mirevo_anchor"]
            del link["mirevo_anchor"]
    if doc == REFERENCE:
        explain_reference(app, doctree)


def explain_reference(app, doctree):
    """Adds to each section and keyword of the reference the pages that explain it."""
    def line(pages):
        text = nodes.paragraph("", "See ", classes=["explained"])
        shown = set()
        for page in pages:
            name, _, heading = page.partition("#")
            title = app.env.titles[name].astext()
            if title in shown or len(shown) == 2:
                continue
            text += [nodes.Text(", ")] if shown else []
            uri = app.builder.get_relative_uri(REFERENCE, name) + ("#" + heading if heading else "")
            text += nodes.reference("", title, internal=True, refuri=uri)
            shown.add(title)
        return text

    for section in doctree.findall(nodes.section):
        path = section[0].astext().split("/")
        own = next((SECTION_PAGES[name] for name in reversed(path) if name in SECTION_PAGES), None)
        if own:
            section.insert(2, line([own]))
        for entry in section.findall(nodes.entry):
            if not entry["ids"] or section_of(entry) is not section:
                continue
            mentions = app.mirevo_mentions.get(entry["ids"][-1], {})
            pages = [KEYWORD_PAGES[entry.astext()]] if entry.astext() in KEYWORD_PAGES else []
            for page in sorted(mentions, key=lambda name: (-mentions[name][0], name)):
                heading = mentions[page][1]
                if not own or page != own.partition("#")[0] or heading:
                    pages.append(page + ("#" + heading if heading else ""))
            if pages:
                entry.parent[-1] += line(pages)


def mend_theme(app, exception):
    """Debian's copy of the theme lacks what its bundler and its compiler of styles do not know: its script is a module,
    which a browser does not load from disk, its style imports another from the root of a server, and the dark colours
    are not those of a browser that prefers them. Nothing is changed in a copy that has them."""
    folder = pathlib.Path(app.outdir, "_static")
    script = folder / "scripts/furo.js"
    text = script.read_text(encoding="utf-8")
    imported = re.search(r'^import Gumshoe from "\./(.*)";$', text, re.M)
    if imported:
        gumshoe = (script.parent / imported.group(1)).read_text(encoding="utf-8")
        script.write_text(gumshoe + text.replace(imported.group(0), ""), encoding="utf-8")
    style = folder / "styles/furo.css"
    text = style.read_text(encoding="utf-8")
    text = re.sub(r"^@import url\(/.*\n", "", text)
    dark = re.search(r'body\[data-theme="dark"\] (\{[^}]*\})', text)
    if dark and "prefers-color-scheme" not in text:
        text += ("@media not print { @media (prefers-color-scheme: dark) "
                 f'{{ body:not([data-theme="light"]) {dark.group(1)} }} }}\n')
    style.write_text(text, encoding="utf-8")


def start(app, env, names):
    text = pathlib.Path(app.srcdir, REFERENCE + ".md").read_text(encoding="utf-8")
    app.mirevo_reference = Reference(text)
    app.mirevo_mentions = {}


def setup(app):
    app.add_lexer("kdx", SetupLexer)
    app.add_domain(SetupDomain)
    app.connect("source-read", read_source)
    app.connect("env-before-read-docs", start)
    app.connect("doctree-read", link_keywords)
    app.connect("doctree-resolved", resolve_links)
    app.connect("build-finished", mend_theme)
    return {"parallel_read_safe": False}
