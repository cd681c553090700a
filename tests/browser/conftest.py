"""The console in headless Chromium, on the real agent with real logs."""

import importlib.util
import shutil
import sys
import time
from pathlib import Path
from urllib.parse import quote

import pytest
from selenium import webdriver
from selenium.webdriver.chrome.options import Options
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common.by import By
from selenium.webdriver.support.ui import Select

ROOT = Path(__file__).resolve().parents[2]
PICTURES = ROOT / "build/browser"
SYSTEM = ROOT / "tests/system"


def _load(name, path):
    module_source = importlib.util.spec_from_file_location(name, path)
    module = importlib.util.module_from_spec(module_source)
    sys.modules[name] = module
    module_source.loader.exec_module(module)
    return module


# The agent and the client of its API are those of the system tests, where these modules have their
# names; here they are modules of a package, so that both can be run at once.
harness = sys.modules.get("conftest") or _load("conftest", SYSTEM / "conftest.py")
api = _load("zrm_api", SYSTEM / "api.py")

PATIENCE = 15


def until(condition, what, seconds=PATIENCE):
    """Polls until the condition gives something true; elements may be exchanged meanwhile."""
    deadline = time.monotonic() + seconds
    while True:
        try:
            value = condition()
        except Exception as error:  # the page redraws itself under the question
            value, last = None, error
        else:
            last = None
        if value:
            return value
        if time.monotonic() > deadline:
            pytest.fail(f"waited {seconds} s for {what}; {last or ''}")
        time.sleep(0.05)


class Page:
    """The console as a person meets it: by labels, roles and texts."""

    def __init__(self, driver):
        self.driver = driver
        self.address = ""
        self.token = ""

    # ------------------------------------------------------------------ going about

    def open(self, view="logs", token=True):
        self.driver.get("about:blank")
        fragment = f"token={self.token}&/{view}" if token else f"/{view}"
        self.driver.get(f"{self.address}#{fragment}")

    def go(self, link):
        self.find(f"//nav//a[normalize-space()='{link}']").click()
        self.heading(link)

    def heading(self, text):
        return self.find(f"//h1[normalize-space()='{text}']")

    def find(self, xpath):
        return until(lambda: self.driver.find_element(By.XPATH, xpath), xpath)

    def text_of(self, xpath):
        """The text of an element that the page may exchange between finding and reading it."""
        return until(lambda: self.driver.find_element(By.XPATH, xpath).text, f"a text in {xpath}")

    def all(self, css):
        return self.driver.find_elements(By.CSS_SELECTOR, css)

    def button(self, name, scope=""):
        quoted = f"[normalize-space()='{name}' or @aria-label='{name}']"
        return self.find(f"{scope}//button{quoted} | {scope}//a{quoted}")

    def click(self, name, scope=""):
        until(lambda: self.button(name, scope).click() or True, f"a click on {name}")

    def control(self, label):
        found = self.find(f"//label[normalize-space()='{label}']")
        identifier = found.get_attribute("for")
        return self.driver.find_element(By.ID, identifier) if identifier else found.find_element(By.TAG_NAME, "input")

    def type(self, label, text):
        control = self.control(label)
        control.clear()
        control.send_keys(text)

    def choose(self, label, text):
        until(lambda: Select(self.control(label)).select_by_visible_text(text) or True, f"{text} in {label}")

    def text(self):
        return self.driver.find_element(By.TAG_NAME, "body").text

    def wait_text(self, text, seconds=PATIENCE):
        until(lambda: text in self.text(), f"the text {text!r}", seconds)

    def run(self, script, *arguments):
        return self.driver.execute_script(script, *arguments)

    # ------------------------------------------------------------------ what views share

    def pick(self, label, text):
        """Chooses in a list that has its label as attribute alone."""
        until(
            lambda: Select(self.find(f"//select[@aria-label='{label}']")).select_by_visible_text(text) or True,
            f"{text} in {label}",
        )

    def open_log(self, log):
        self.open(f"logs?log={quote(str(log))}")
        self.heading(str(log))

    def wait_live(self, seconds=PATIENCE):
        until(lambda: self.find("//*[@class='state good']").text == "Live", "the stream", seconds)

    def condition(self, value, number=1, operator=None):
        """Adds a condition on the description."""
        self.click("Add a condition")
        group = f"(//*[@role='group' and @aria-label='Condition'])[{number}]"
        if operator:
            self.find(f"{group}//select[@aria-label='Operator']/option[.='{operator}']").click()
        self.find(f"{group}//input").send_keys(value)
        return self.find(f"{group}//input")

    def run_report(self, log, entries):
        self.choose("Log", str(log))
        self.click("Run the report")
        self.wait_text(entries)

    def saved(self, kind):
        """The text of the report's download as CSV or JSON."""
        file = self.driver.downloads / f"{Select(self.control('Log')).first_selected_option.text.split('/')[-1]}.{kind.lower()}"
        file.unlink(missing_ok=True)
        self.click(f"Download as {kind}")
        until(file.exists, "the download")
        return file.read_bytes().decode("utf-8")

    def rows(self, caption):
        """The texts of a table's rows."""
        found = self.driver.find_elements(By.XPATH, f"//table[starts-with(caption, '{caption}')]/tbody/tr")
        return [row.text for row in found]

    def lose(self, agent):
        """Ends the agent; its next start listens where this one did."""
        agent.listen = f"127.0.0.1:{self.api.port}"
        agent.stop()
        self.wait_text("The connection to the agent is lost")

    def expect_complaints(self):
        """Forgets what the browser has complained of: lost connections, refused requests."""
        self.driver.get_log("browser")

    # ------------------------------------------------------------------ looking

    def size(self, width, height=800):
        self.driver.execute_cdp_cmd(
            "Emulation.setDeviceMetricsOverride",
            {"width": width, "height": height, "deviceScaleFactor": 1, "mobile": False},
        )

    def scheme(self, name):
        self.driver.execute_cdp_cmd(
            "Emulation.setEmulatedMedia", {"features": [{"name": "prefers-color-scheme", "value": name}]}
        )

    def settle(self):
        """Waits until what has changed is drawn."""
        if self.all("canvas"):
            time.sleep(0.15)  # a chart is drawn anew for its size and colours
        self.driver.execute_async_script("requestAnimationFrame(() => requestAnimationFrame(arguments[0]))")

    def pictures(self, name):
        """Both widths in both colour schemes; each must fit its width."""
        PICTURES.mkdir(parents=True, exist_ok=True)
        for width in (1280, 360):
            self.size(width)
            for scheme in ("light", "dark"):
                self.scheme(scheme)
                self.settle()
                self.driver.save_screenshot(str(PICTURES / f"{name}-{width}-{scheme}.png"))
                wide = self.run("return document.documentElement.scrollWidth")
                assert wide <= width, f"{name} is {wide} pixels wide at {width}"
        self.scheme("light")
        self.size(1280)

    def cells_fit(self):
        """No cell of a table is cut or covers the next one where the page is narrow."""
        self.size(360)
        self.settle()
        cut = "return [...document.querySelectorAll('.cards td')].filter((td) => td.scrollWidth > td.clientWidth + 1)"
        assert self.run(f"{cut}.map((td) => td.textContent)") == []
        self.size(1280)

    def console_errors(self):
        """What the browser complained of: refused scripts and styles, exceptions."""
        entries = self.driver.get_log("browser")
        return [entry["message"] for entry in entries if entry["source"] in ("security", "javascript")]


@pytest.fixture(scope="session")
def driver(tmp_path_factory):
    options = Options()
    profile = tmp_path_factory.mktemp("profile")
    for argument in (
        "--headless=new", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage", "--no-first-run",
        "--disable-background-networking", "--disable-component-update", "--disable-sync", "--lang=en-US",
        "--force-color-profile=srgb", f"--user-data-dir={profile}",
    ):
        options.add_argument(argument)
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    options.add_experimental_option(
        "prefs", {"download.default_directory": str(profile / "downloads"), "download.prompt_for_download": False}
    )
    options.binary_location = shutil.which("chromium")
    started = webdriver.Chrome(service=Service(shutil.which("chromedriver")), options=options)
    started.downloads = profile / "downloads"
    yield started
    started.quit()


@pytest.fixture
def agent(tmp_path):
    """An agent that listens at a free port, ended with its test."""
    made = harness.Agent(tmp_path)
    made.listen = "127.0.0.1:0"
    yield made
    made.dispose()


@pytest.fixture
def page(driver, agent):
    """The browser on the agent once it has been started with `page.on(agent)`."""
    opened = Page(driver)

    def on(started, view="logs"):
        opened.api = api.Api(started)
        opened.address = f"http://127.0.0.1:{opened.api.port}/"
        opened.token = opened.api.token
        opened.open(view)
        return opened

    opened.on = on
    opened.size(1280)
    opened.scheme("light")
    driver.get_log("browser")
    yield opened
    assert opened.console_errors() == []
    driver.get("about:blank")


@pytest.fixture
def fast_polls(driver):
    """Views ask ten times as often, and what is lost is looked for as often."""
    source = (
        "const plain = setInterval; window.setInterval = (action, time) => plain(action, time / 10);"
        "const once = setTimeout; window.setTimeout = (action, time) => once(action, time < 1000 ? time : time / 10);"
    )
    made = driver.execute_cdp_cmd("Page.addScriptToEvaluateOnNewDocument", {"source": source})
    yield
    driver.execute_cdp_cmd("Page.removeScriptToEvaluateOnNewDocument", made)


syslog_line = harness.syslog_line
