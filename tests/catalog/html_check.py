"""Browses the site of `tarn-catalog html` in headless chromium.

  html_check.py <tarn-catalog> <chromium> <work dir>

Writes the site, loads pages in the browser (so that site.js has run) and checks
that every link of a loaded page leads to a file of the site, and that the version
switch hides exactly what the chosen version does not include: on the index the
types, on a type page the members. What a version includes comes from
`tarn-catalog dump`, not from the site. Exit status 0 when all holds.
"""
import html.parser
import json
import os
import shutil
import subprocess
import sys
import tempfile
import urllib.parse

catalog, chromium, work = sys.argv[1:4]
site = os.path.join(work, "site")
shutil.rmtree(site, ignore_errors=True)
subprocess.run([catalog, "html", "--out", site], check=True, stdout=subprocess.DEVNULL)
dump = json.loads(subprocess.run([catalog, "dump"], check=True, capture_output=True, text=True).stdout)
includes = {v["name"]: set(v["includes"]) for v in dump["versions"]}
failures = []


class Dom(html.parser.HTMLParser):
    """The links, and the rows and items that carry a version, with their hidden state."""

    def __init__(self):
        super().__init__()
        self.links, self.versioned, self.stack, self.row = [], [], [], None

    def handle_starttag(self, tag, attrs):
        attrs = dict(attrs)
        hidden = "hidden" in attrs
        if tag in ("meta", "link", "br", "input", "img"):
            return
        self.stack.append(hidden)
        if tag == "a" and "href" in attrs:
            self.links.append(attrs["href"])
            if self.row is not None:
                self.row[3].append(attrs["href"])
        if "data-version" in attrs and tag in ("tr", "li"):
            self.versioned.append((tag, attrs["data-version"], any(self.stack), []))
            if tag == "tr":
                self.row = self.versioned[-1]

    def handle_endtag(self, tag):
        if tag not in ("meta", "link", "br", "input", "img") and self.stack:
            self.stack.pop()
        if tag == "tr":
            self.row = None


def browse(page, version):
    url = "file://" + os.path.join(site, page) + ("?v=" + urllib.parse.quote(version) if version else "")
    profile = tempfile.mkdtemp(dir=work)
    try:
        out = subprocess.run([chromium, "--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
                              "--disable-background-networking", "--disable-component-update", "--disable-sync",
                              "--user-data-dir=" + profile, "--dump-dom", url],
                             check=True, capture_output=True, text=True, timeout=120).stdout
    finally:
        shutil.rmtree(profile, ignore_errors=True)
    dom = Dom()
    dom.feed(out)
    if "api-version" not in out or "<option" not in out:
        failures.append(f"{page}: the version switch was not filled (did site.js run?)")
    return dom


def check_links(page, dom, version):
    base = os.path.dirname(os.path.join(site, page))
    for href in dom.links:
        parts = urllib.parse.urlsplit(href)
        if parts.scheme:
            failures.append(f"{page}: link leaves the site: {href}")
            continue
        target = os.path.normpath(os.path.join(base, urllib.parse.unquote(parts.path))) if parts.path else os.path.join(site, page)
        if not os.path.isfile(target):
            failures.append(f"{page}: broken link {href}")
        if version and parts.path and f"v={version}" not in urllib.parse.unquote(parts.query):
            failures.append(f"{page}: link {href} drops the chosen version")


def check_hiding(page, dom, version):
    if not dom.versioned:
        failures.append(f"{page}: no rows carry a version")
    for tag, introduced, hidden, _ in dom.versioned:
        if page == "versions.html" and tag == "tr":
            continue
        expected_hidden = bool(version) and introduced not in includes[version]
        if hidden != expected_hidden:
            failures.append(f"{page} as {version or 'every version'}: a {tag} of {introduced} is "
                            f"{'hidden' if hidden else 'shown'}")


# The index and the pages of types whose members came in several versions.
pages = ["index.html", "types/tarn.ServiceInstance.html", "types/tarn.DebugManager.html", "types/tarn.vmprov.FtSyncContext.html"]
for page in pages:
    for version in ["", "tarn.version.version1", "tarn.version.version6"]:
        dom = browse(page, version)
        check_links(page, dom, version)
        check_hiding(page, dom, version)

# The index as version 1 shows exactly the types version 1 sees.
seen = json.loads(subprocess.run([catalog, "--api-version", "tarn.version.version1", "dump"], check=True,
                                 capture_output=True, text=True).stdout)
dom = browse("index.html", "tarn.version.version1")
shown = {os.path.basename(urllib.parse.urlsplit(row[3][0]).path)[:-len(".html")]
         for row in dom.versioned if not row[2] and row[3]}
shown = {name for name in shown if name.startswith("tarn.")}
expected = {t["name"] for t in seen["types"]}
if shown != expected:
    failures.append(f"index as tarn.version.version1: shown but not seen {sorted(shown - expected)}, "
                    f"seen but not shown {sorted(expected - shown)}")

for f in failures:
    print("html_check:", f)
print(f"html_check: {len(pages)} pages browsed, {len(failures)} failures")
sys.exit(1 if failures else 0)
