"""Labels, roles, focus and contrast of every view, computed in the page."""

import pytest
from browser.conftest import until
from selenium.webdriver.common.keys import Keys

from browser.support import REFUSED_FIELDS, fill_history, history_of

VIEWS = ["logs", "logs?log=/none", "events", "situations", "situations?new", "situations?name=ssh-failed", "episodes", "silences", "silences?situation=x", "reports", "try"]

# Gives each element with text of its own whose colours are too near each other: WCAG AA.
CONTRAST = """
const paint = document.createElement('canvas').getContext('2d', {willReadFrequently: true});
const rgb = (text) => {
  paint.clearRect(0, 0, 1, 1); paint.fillStyle = text; paint.fillRect(0, 0, 1, 1);
  const [r, g, b, a] = paint.getImageData(0, 0, 1, 1).data; return [r, g, b, a / 255];
};
const light = ([r, g, b]) => [r, g, b].map((v) => v / 255).map((v) => v <= 0.03928 ? v / 12.92 : ((v + 0.055) / 1.055) ** 2.4)
  .reduce((sum, v, i) => sum + v * [0.2126, 0.7152, 0.0722][i], 0);
const ground = (element) => {
  for (let at = element; at; at = at.parentElement) {
    const colour = rgb(getComputedStyle(at).backgroundColor);
    if (colour[3] > 0.99) return colour;
  }
  return [255, 255, 255, 1];
};
const poor = [];
let seen = 0;
for (const element of document.body.querySelectorAll('*')) {
  const own = [...element.childNodes].some((node) => node.nodeType === 3 && node.data.trim());
  if (!own || element.disabled || !element.checkVisibility() || element.closest('noscript, option')) continue;
  seen += 1;
  const style = getComputedStyle(element);
  const [a, b] = [light(rgb(style.color)), light(ground(element))].sort((x, y) => y - x);
  const ratio = (a + 0.05) / (b + 0.05);
  const size = parseFloat(style.fontSize);
  const wanted = size >= 24 || (size >= 18.66 && style.fontWeight >= 700) ? 3 : 4.5;
  if (ratio < wanted) poor.push(`${element.tagName}.${element.className} "${element.textContent.slice(0, 30)}" ${ratio.toFixed(2)}`);
}
return [seen, poor];
"""

# Gives each control without a name, each table or heading order that is broken, each double id.
STRUCTURE = """
const faults = [];
const name = (e) => e.getAttribute('aria-label') || [...(e.labels || [])].map((l) => l.textContent).join(' ')
  || (e.getAttribute('aria-labelledby') || '').split(' ').map((i) => document.getElementById(i)?.textContent || '').join(' ')
  || e.textContent || e.title;
for (const e of document.querySelectorAll('a[href], button, input, select, textarea, [role=img], [role=listbox], [tabindex="0"]'))
  if (e.checkVisibility() && !name(e).trim()) faults.push(`no name: ${e.outerHTML.slice(0, 120)}`);
for (const e of document.querySelectorAll('input, select, textarea'))
  if (e.checkVisibility() && !e.labels?.length && !e.getAttribute('aria-label')) faults.push(`no label: ${e.outerHTML.slice(0, 120)}`);
for (const e of document.querySelectorAll('table')) {
  if (!e.caption) faults.push('table without caption');
  if ([...e.querySelectorAll('thead th')].some((th) => th.scope !== 'col')) faults.push('table head without scope');
}
for (const e of document.querySelectorAll('[aria-describedby], [aria-labelledby]'))
  for (const id of (e.getAttribute('aria-describedby') || e.getAttribute('aria-labelledby')).split(' '))
    if (!document.getElementById(id)) faults.push(`refers to nothing: ${id}`);
const ids = [...document.querySelectorAll('[id]')].map((e) => e.id);
for (const id of new Set(ids)) if (ids.filter((one) => one === id).length > 1) faults.push(`twice: ${id}`);
if (document.querySelectorAll('h1').length !== 1) faults.push('not one h1');
if (document.querySelectorAll('main').length !== 1 || !document.documentElement.lang) faults.push('no main or language');
if (!document.querySelector('nav a[aria-current=page]')) faults.push('present view not marked');
if ([...document.querySelectorAll('[tabindex]')].some((e) => e.tabIndex > 0)) faults.push('positive tabindex');
return faults;
"""


@pytest.fixture
def console(page, agent):
    auth = agent.log("auth.log", content=history_of(5))
    agent.configure(f"{agent.directory}/missing.log", append=True)
    agent.log("broken.log", fields=REFUSED_FIELDS)
    agent.situation("ssh-failed", log=auth, when=["ENTRYDESC contains 'Failed password'"], severity="critical")
    agent.start(wait=False)  # the broken log is never opened
    agent.wait_trace("Agent server is listening; signal sent.")
    agent.wait_open(auth)
    fill_history(agent, auth, 2)
    return page.on(agent)


def ready(page, view):
    page.open(view)
    page.find("//h1")
    until(lambda: not page.all(".loading[role=status]"), "the view")


def test_structure_and_contrast_of_every_view(console):
    for view in VIEWS:
        ready(console, view)
        assert console.run(STRUCTURE) == [], view
        for width in (1280, 360):
            console.size(width)
            for scheme in ("light", "dark"):
                console.scheme(scheme)
                seen, poor = console.run(CONTRAST)
                assert seen > 8 and poor == [], f"{view}, {width}, {scheme}"
        console.size(1280)


def troubled(console):
    """What is only seen when something is off, each as it comes."""
    ready(console, "situations?new")
    console.type("Name", "bad")
    console.choose("Log", console.api.request("GET", "/api/v1/logs")[2]["logs"][0]["log"])
    console.condition("port [", operator="matches")
    console.wait_text("Correct what is marked")
    yield "a condition that is wrong"
    ready(console, "events")
    console.find("//*[@role='option']").click()
    console.click("Why was it raised?")
    console.wait_text("Would be raised")
    yield "an event"
    ready(console, "try")
    console.type("Lines", "2026-11-20 07:03:09 ERROR payment: fits\nno entry at all")
    console.wait_text("Stops at column 1")
    yield "a line that does not fit"
    console.run("sessionStorage.clear(); location.hash = '#/reports'")
    console.heading("Sign in")
    yield "no token"


def test_contrast_of_what_is_off(console):
    for state in troubled(console):
        for scheme in ("light", "dark"):
            console.scheme(scheme)
            seen, poor = console.run(CONTRAST)
            assert seen > 5 and poor == [], f"{state}, {scheme}"


def test_the_keyboard_reaches_everything_in_order(console):
    ready(console, "reports")
    console.run("document.activeElement.blur()")
    reached = []
    for _ in range(40):
        console.driver.switch_to.active_element.send_keys(Keys.TAB)
        text = console.run(
            "const e = document.activeElement; return e === document.body ? '' :"
            " (e.labels?.[0]?.textContent || e.textContent).trim()"
        )
        if text and (not reached or reached[-1] != text):
            reached.append(text)
        if text == "Run the report":
            break
    wanted = ["Skip to content", "Logs", "Events", "Situations", "Reports", "Try a format", "Log", "Time", "From", "To", "Add a condition", "Run the report"]
    assert [text for text in reached if text in wanted] == wanted
    assert console.run("return getComputedStyle(document.activeElement).outlineStyle") == "solid"
    console.driver.switch_to.active_element.send_keys(Keys.ENTER)
    console.wait_text("entries")


def tab_to(console, name):
    """Goes on with the Tab key to what has this name; where it stands must show."""
    for _ in range(60):
        console.driver.switch_to.active_element.send_keys(Keys.TAB)
        found = console.run(
            "const e = document.activeElement; return e === document.body ? null :"
            " [e.getAttribute('aria-label') || e.labels?.[0]?.textContent || e.textContent, getComputedStyle(e).outlineStyle]"
        )
        if found and found[0].strip() == name:
            assert found[1] == "solid", f"{name} does not show that it has the focus"
            return console.driver.switch_to.active_element
    raise AssertionError(f"the Tab key does not reach {name}")


def test_a_situation_lives_by_the_keyboard_alone(console):
    ready(console, "logs")
    tab_to(console, "Situations").send_keys(Keys.ENTER)
    console.heading("Situations")
    tab_to(console, "New situation").send_keys(Keys.ENTER)
    console.heading("New situation")
    tab_to(console, "Name").send_keys("by-keyboard")
    tab_to(console, "Log").send_keys(Keys.ARROW_DOWN)
    tab_to(console, "Add a condition").send_keys(Keys.ENTER)
    console.driver.switch_to.active_element.send_keys("password")
    console.wait_text("Would have been raised")
    tab_to(console, "Create situation").send_keys(Keys.ENTER)
    console.heading("by-keyboard")
    for verb, state in (("Stop", "Stopped"), ("Start", "Running")):
        tab_to(console, f"{verb} by-keyboard").send_keys(Keys.ENTER)
        until(lambda: console.find("//h1/following-sibling::span").text == state, state)
    tab_to(console, "Delete by-keyboard").send_keys(Keys.ENTER)
    until(lambda: console.all("dialog"), "the question")
    tab_to(console, "Delete").send_keys(Keys.ENTER)
    console.heading("Situations")
    until(lambda: "by-keyboard" not in console.text(), "the deletion")


def test_buttons_are_told_from_fields_on_a_narrow_screen(console):
    console.size(360)
    ready(console, "situations?new")
    console.condition("one")
    looks = console.run(
        "return [...document.querySelectorAll('.condition > *')].filter((e) => e.matches('select, input, button'))"
        ".map((e) => [e.tagName, getComputedStyle(e).backgroundColor, e.getBoundingClientRect().width, e.scrollWidth > e.clientWidth])"
    )
    fields = [look for look in looks if look[0] != "BUTTON"]
    ((_, ground, width, is_cut),) = [look for look in looks if look[0] == "BUTTON"]
    assert ground not in [look[1] for look in fields]
    assert width < 100 and not is_cut


def test_what_stays_the_same_is_not_read_aloud_again(console, fast_polls):
    ready(console, "logs")
    console.wait_text("in trouble")
    console.run(
        "window.said = []; for (const e of document.querySelectorAll('main [role=status], main [role=alert], header [role=status]'))"
        " new MutationObserver((all) => said.push(e.outerHTML)).observe(e, {childList: true, characterData: true, subtree: true})"
    )
    asked = "return performance.getEntriesByType('resource').filter((one) => one.name.endsWith('/api/v1/logs')).length"
    before = console.run(asked)
    until(lambda: console.run(asked) >= before + 3, "three more answers")
    assert console.run("return said") == []


def test_motion_is_not_needed(console):
    animated = console.run(
        "return [...document.querySelectorAll('*')].filter((e) => getComputedStyle(e).animationName !== 'none').length"
    )
    assert animated == 0


def test_a_dialog_takes_the_focus_and_gives_it_back(console):
    status, _, _ = console.api.request(
        "POST", "/api/v1/situations",
        {"name": "mine", "text": "", "severity": "info", "log": console.api.request("GET", "/api/v1/logs")[2]["logs"][0]["log"], "when": []},
    )
    assert status == 201
    ready(console, "situations")
    console.click("Delete mine")
    assert console.run("return document.activeElement.closest('dialog') !== null")
    console.driver.switch_to.active_element.send_keys(Keys.ESCAPE)
    until(lambda: not console.all("dialog"), "the dialog to go")
    assert console.run("return document.activeElement.getAttribute('aria-label')") == "Delete mine"
