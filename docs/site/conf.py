"""How Sphinx makes the site. Its pages are the files of the repository as they are, so that their links lead
to the same places in the repository and in the site. scripts/docs runs it."""

import os
import pathlib
import re
import subprocess

from docutils import nodes
from docutils.parsers.rst import Directive

ROOT = pathlib.Path(__file__).resolve().parents[2]

project = html_title = "libsecpolicy"
extensions = ["myst_parser", "breathe"]

root_doc = "docs/index"
include_patterns = ["*.md", "docs/*.md"]
# What builds and tests leave behind is not walked.
exclude_patterns = [entry.name for entry in ROOT.iterdir() if entry.is_dir() and entry.name != "docs"]

myst_heading_anchors = 4
# Images of a given width are written as in HTML.
myst_enable_extensions = ["html_image"]
highlight_language = "none"

# What Doxygen has read in the public headers.
breathe_projects = {project: os.environ["DOXYGEN_XML"]}
breathe_default_project = project

html_theme = "furo"
html_static_path = ["static"]
html_css_files = ["site.css"]
html_copy_source = False
html_show_copyright = False
html_show_sphinx = False
# The way in, where one looks for it.
html_additional_pages = {"index": "way-in.html"}
templates_path = ["templates"]


class Manual(Directive):
    """Shows a manual page, which is named as seen from docs/, as a terminal does."""

    required_arguments = 1

    def run(self):
        shown = subprocess.run(["mandoc", "-T", "utf8", "-O", "width=88", ROOT / "docs" / self.arguments[0]],
                               check=True, capture_output=True, text=True).stdout
        text = re.sub(".\\x08", "", shown)  # what a terminal would show bold or underlined
        return [nodes.literal_block(text, text, language="none")]


def mend_theme(app, _failure):
    """As Debian builds this theme, it looks for a style outside of the site, and its dark colours count only
    where somebody has chosen them: here they count where the system is dark as well."""
    path = pathlib.Path(app.outdir, "_static/styles/furo.css")
    style = path.read_text()
    outside = "@import url(/javascript/normalize.css/normalize.css);"
    dark = re.search(r'body\[data-theme="dark"\] (\{.*?\})', style, re.DOTALL)[1]
    if outside in style:
        normal = pathlib.Path("/usr/share/javascript/normalize.css/normalize.css").read_text()
        style = style.replace(outside, normal)
    style += f'@media (prefers-color-scheme: dark) {{ body:not([data-theme="light"]) {dark} }}\n'
    path.write_text(style)


def setup(app):
    app.add_directive("manual", Manual)
    app.connect("build-finished", mend_theme)
