"""The workbench in a browser: starts the program and the browser, and knows where things stand on the page."""
import json
import os
import shutil
import signal
import subprocess
import tempfile
import urllib.error
import urllib.request

WAIT_SECONDS = 30


def missing_parts():
    """Why no browser can be driven here, or None."""
    try:
        import selenium  # noqa: F401
    except ImportError:
        return "python3-selenium is not installed"
    for program in ("chromium", "chromedriver"):
        if shutil.which(program) is None:
            return "%s is not installed" % program
    return None


class Workbench:
    """The program with a folder of its own, which is a copy of one of the examples."""

    def __init__(self, vlmail, folder, settings, *options):
        self.home = tempfile.mkdtemp(prefix="workbench")
        self.folder = os.path.join(self.home, "letters")
        shutil.copytree(folder, self.folder)
        self.settings = os.path.join(self.home, "node.json")
        if settings:
            shutil.move(os.path.join(self.folder, settings), self.settings)
            options += ("--settings", self.settings)
        self.process = subprocess.Popen(
            [vlmail, "workbench", self.folder, *options],
            stdout=subprocess.PIPE,
            env={**os.environ, "HOME": self.home},
            text=True,
        )
        self.url = self.process.stdout.readline().strip()
        self.origin, _, self.token = self.url.partition("/#")

    def text(self):
        with open(self.settings, encoding="utf-8") as file:
            return file.read()

    def write(self, text):
        with open(self.settings, "w", encoding="utf-8") as file:
            file.write(text)

    def ask(self, name, body, headers=None):
        """Status and answer of a request that no browser sends."""
        given = {"Content-Type": "application/json", "X-Workbench-Token": self.token, **(headers or {})}
        request = urllib.request.Request(self.origin + "/api/" + name, json.dumps(body).encode(), given)
        try:
            with urllib.request.urlopen(request, timeout=WAIT_SECONDS) as answer:
                return answer.status, json.load(answer)
        except urllib.error.HTTPError as refused:
            return refused.code, json.load(refused)

    def end(self):
        """Its exit status."""
        self.process.send_signal(signal.SIGINT)
        status = self.process.wait(WAIT_SECONDS)
        self.process.stdout.close()
        shutil.rmtree(self.home)
        return status


def start_browser(language="en-GB", scheme="light", size=(1500, 1000)):
    from selenium import webdriver
    from selenium.webdriver.chrome.service import Service

    options = webdriver.ChromeOptions()
    for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--hide-scrollbars", "--lang=" + language):
        options.add_argument(argument)
    options.add_experimental_option("prefs", {"intl.accept_languages": language})
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    driver = webdriver.Chrome(service=Service(shutil.which("chromedriver")), options=options)
    driver.set_script_timeout(WAIT_SECONDS)
    look(driver, scheme, size)
    return driver


def keys():
    from selenium.webdriver.common.keys import Keys

    return Keys


def leave(driver):
    """Nothing that is left unsaved may ask whether to leave."""
    driver.get("about:blank")


def look(driver, scheme="light", size=(1500, 1000), language="en-GB"):
    """Sets the colours, the size of the window and the language of what is opened next."""
    command = driver.execute_cdp_cmd
    command("Emulation.setEmulatedMedia", {"features": [{"name": "prefers-color-scheme", "value": scheme}]})
    command("Emulation.setDeviceMetricsOverride", {"width": size[0], "height": size[1], "deviceScaleFactor": 1, "mobile": False})
    agent = driver.execute_script("return navigator.userAgent")
    command("Emulation.setUserAgentOverride", {"userAgent": agent, "acceptLanguage": language})


def marks_in(driver, sheet):
    """What is drawn on a sheet of the workbench or of a report: looks, words, names, and places in per cent."""
    script = """
        const within = (mark) => ["left", "top", "width", "height"].map((side) => mark.style[side]);
        return [...document.querySelector(arguments[0]).querySelectorAll("a")].map((mark) => [mark.className.replace("chosen", "").trim(),
            mark.ariaLabel, mark.querySelector(".tag")?.textContent ?? "", ...within(mark).map((side) => Math.round(parseFloat(side) * 100) / 100)]);
    """
    return driver.execute_script(script, sheet)


class Page:
    """What a person sees and does, by the names that are on the page."""

    def __init__(self, driver, url):
        self.driver = driver
        driver.get("about:blank")
        driver.get(url)

    def wait(self, condition, what):
        from selenium.common.exceptions import StaleElementReferenceException, TimeoutException
        from selenium.webdriver.support.ui import WebDriverWait

        waiting = WebDriverWait(self.driver, WAIT_SECONDS, 0.02, [StaleElementReferenceException])
        try:
            return waiting.until(lambda _: condition())
        except TimeoutException:
            raise AssertionError("waited in vain: %s; the page says: %s" % (what, self.texts("#message, #alert, #counts")))

    def find(self, selector):
        return self.driver.find_elements("css selector", selector)

    def one(self, selector):
        return self.wait(lambda: next((one for one in self.find(selector) if one.is_displayed()), None), selector)

    def texts(self, selector):
        return self.run("return [...document.querySelectorAll(arguments[0])].map((one) => one.innerText)", selector)

    def run(self, script, *arguments):
        return self.driver.execute_script(script, *arguments)

    def imported(self, module, expression, *arguments):
        """What a module of the page gives, where it is named `m` and the arguments `a`."""
        script = """
            const [file, code, a, done] = arguments;
            import(file).then((m) => done({ value: (%s) })).catch((failure) => done({ failure: String(failure) }));
        """
        answer = self.driver.execute_async_script(script % expression, "/" + module, expression, arguments)
        assert "failure" not in answer, answer["failure"]
        return answer["value"]

    def wait_until_read(self):
        """Until the document that is open was read by the settings as they are, and drawn."""
        self.wait(lambda: not self.find("#fields-body[aria-busy]") and self.find("#fields-body .quietly, #fields-body .why"), "the reading")
        return self

    def wait_for_picture(self):
        self.wait(lambda: self.run("const i = document.querySelector('#stage img'); return i.complete && i.naturalWidth > 0"), "the picture")
        return self

    def choose(self, document):
        """Opens a document of the list by the mouse."""
        row = "return [...document.querySelectorAll('#list .row')].find((one) => one.innerText.startsWith(arguments[0]))"
        self.wait(lambda: self.run(row, document).click() is None, "the row of " + document)

    def field(self, name):
        """The state and the value that the field is shown with."""
        script = """
            const card = [...document.querySelectorAll('#fields-body .field')].find((one) => one.ariaLabel === arguments[0]);
            return card && [card.querySelector('.state').textContent, card.querySelector('.value')?.innerText ?? ''];
        """
        return self.run(script, name)

    def wait_for_field(self, name, value):
        self.wait(lambda: self.field(name) == ["\u2713 found", value], "the field %s as %r: %r" % (name, value, self.field(name)))

    def settings(self):
        """The settings as the editor has them."""
        return self.run(
            "const m = document.querySelector('#editor .CodeMirror');"
            "return m ? m.CodeMirror.getValue() : document.querySelector('#editor textarea').value"
        )

    def type_settings(self, text):
        """Replaces all that stands in the editor, as if it was typed."""
        self.run("document.querySelector('#editor .CodeMirror').CodeMirror.setValue(arguments[0])", text)

    def keys(self, *keys):
        from selenium.webdriver.common.action_chains import ActionChains

        ActionChains(self.driver, 0).send_keys(*keys).perform()

    def chord(self, modifier, *keys):
        from selenium.webdriver.common.action_chains import ActionChains

        chain = ActionChains(self.driver, 0).key_down(modifier)
        chain.send_keys(*keys).key_up(modifier).perform()

    def select(self, selector, value):
        """Chooses from a list of choices."""
        from selenium.webdriver.support.ui import Select

        Select(self.one(selector)).select_by_value(value)

    def marks(self):
        """What is drawn on the page that is shown, in per cent of it."""
        return marks_in(self.driver, "#stage .sheet")

    def drag(self, selector, start, by):
        """From a part of the element, such as (0.5, 1) for the middle of its lower edge, by so many millimetres of the page."""
        from selenium.webdriver.common.actions.action_builder import ActionBuilder

        self.run("document.querySelector(arguments[0]).scrollIntoView({ block: 'center' })", selector)
        left, top, width, height = self.rectangle(selector)
        millimetre = self.rectangle("#stage .sheet")[2] / 210
        x, y = left + start[0] * width, top + start[1] * height
        builder = ActionBuilder(self.driver, duration=0)
        builder.pointer_action.move_to_location(round(x), round(y)).pointer_down()
        for part in (0.5, 1):
            builder.pointer_action.move_to_location(round(x + part * by[0] * millimetre), round(y + part * by[1] * millimetre))
        builder.pointer_action.pointer_up()
        builder.perform()

    def rectangle(self, selector):
        """Left, top, width and height in pixels of the window."""
        return self.run("const b = document.querySelector(arguments[0]).getBoundingClientRect(); return [b.left, b.top, b.width, b.height]", selector)

    def focused(self):
        return self.run("const e = document.activeElement; return e.ariaLabel || e.textContent || e.id")

    def logged(self):
        """What the browser complained about, refused requests aside."""
        return [line["message"] for line in self.driver.get_log("browser") if "/api/" not in line["message"]]

    def picture(self, file):
        self.driver.save_screenshot(file)
