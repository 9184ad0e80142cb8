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


def endless_pdf():
    """A page of forms that draw each other, ten times each and forty deep: nobody ends reading it."""
    font = "/Font << /F 4 0 R >>"
    objects = {
        1: "<< /Type /Catalog /Pages 2 0 R >>",
        2: "<< /Type /Pages /Kids [3 0 R] /Count 1 >>",
        3: "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << %s /XObject << /X6 6 0 R >> >> >>" % font,
        4: "<< /Type /Font /Subtype /Type1 /BaseFont /Helvetica >>",
        5: "<< /Length 6 >>\nstream\n/X6 Do\nendstream",
    }
    for number in range(6, 46):
        content = "BT /F 10 Tf 72 700 Td (Hello) Tj ET" + " /X%d Do" % (number + 1) * 10
        keys = "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << %s /XObject << /X%d %d 0 R >> >>" % (font, number + 1, number + 1)
        objects[number] = "<< /Length %d %s >>\nstream\n%s\nendstream" % (len(content), keys, content)
    objects[46] = "<< /Length 0 /Type /XObject /Subtype /Form /BBox [0 0 595 842] >>\nstream\n\nendstream"
    pdf, offsets = "%PDF-1.7\n", []
    for number, body in sorted(objects.items()):
        offsets.append(len(pdf))
        pdf += "%d 0 obj\n%s\nendobj\n" % (number, body)
    table = "".join("%010d 00000 n \n" % offset for offset in offsets)
    end = "xref\n0 %d\n0000000000 65535 f \n%strailer\n<< /Size %d /Root 1 0 R >>\nstartxref\n%d\n%%%%EOF\n"
    return (pdf + end % (len(objects) + 1, table, len(objects) + 1, len(pdf))).encode()


class Workbench:
    """The program with a folder of its own, which is a copy of one of the examples."""

    def __init__(self, vlmail, folder, settings, *options, user=None):
        self.home = tempfile.mkdtemp(prefix="workbench")
        self.folder = os.path.join(self.home, "letters")
        shutil.copytree(folder, self.folder)
        self.settings = os.path.join(self.home, "node.json")
        if settings:
            shutil.move(os.path.join(self.folder, settings), self.settings)
            options += ("--settings", self.settings)
        if user is not None:
            os.chmod(self.home, 0o755)
        self.process = subprocess.Popen(
            [vlmail, "workbench", self.folder, *options],
            stdout=subprocess.PIPE,
            env={**os.environ, "HOME": self.home},
            text=True,
            user=user,
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


class Service:
    """The service that keeps settings of nodes, on this machine, and what other people do there."""

    def __init__(self, vlmail):
        self.vlmail = vlmail
        self.home = tempfile.mkdtemp(prefix="service")
        self.data = os.path.join(self.home, "data")
        program = os.path.join(os.path.dirname(os.path.dirname(vlmail)), "vlserviced", "vlserviced")
        self.process = subprocess.Popen([program, "--data", self.data, "--no-discovery"], stdout=subprocess.PIPE, text=True)
        self.address = self.process.stdout.readline().split()[-1]
        self.options = self.options_with(os.path.join(self.data, "token"))

    def options_with(self, token):
        return "--service", self.address, "--token", token

    def run(self, *arguments):
        command = [self.vlmail, *arguments, *self.options]
        return subprocess.run(command, check=True, stdout=subprocess.PIPE, text=True, env={**os.environ, "HOME": self.home}).stdout

    def write(self, name, text):
        file = os.path.join(self.home, name)
        with os.fdopen(os.open(file, os.O_WRONLY | os.O_CREAT | os.O_TRUNC, 0o600), "w", encoding="utf-8") as out:
            out.write(text)
        return file

    def set(self, node, part, values):
        self.run("settings", "set", node, part, self.write("part.json", json.dumps(values)))

    def own(self, node, part):
        return json.loads(self.run("settings", "show", node, part, "--json"))["parts"][part]["own"]

    def token(self, name, role, node):
        """The file with a new one."""
        added = self.run("token", "add", name, "--role", role, "--node", node, "--json")
        return self.write(name, json.loads(added)["token"])

    def stop(self):
        self.process.terminate()
        self.process.wait(WAIT_SECONDS)

    def end(self):
        self.stop()
        self.process.stdout.close()
        shutil.rmtree(self.home)


def start_browser(language="en-GB", scheme="light", size=(1500, 1000)):
    from selenium import webdriver
    from selenium.webdriver.chrome.service import Service

    options = webdriver.ChromeOptions()
    for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--hide-scrollbars", "--lang=" + language):
        options.add_argument(argument)
    options.add_experimental_option("prefs", {"intl.accept_languages": language})
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    driver = webdriver.Chrome(service=Service(shutil.which("chromedriver")), options=options)
    driver.set_script_timeout(2 * WAIT_SECONDS)
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


# The settings as the editor has them, the one of the system or a plain field.
SETTINGS = "(document.querySelector('#editor .CodeMirror')?.CodeMirror.getValue() ?? document.querySelector('#editor textarea').value)"

# The state and the value that the field a[0] is shown with.
FIELD = """[...document.querySelectorAll('#fields-body .field')].filter((one) => one.ariaLabel === a[0])
    .map((card) => [card.querySelector('.state').textContent, card.querySelector('.value')?.innerText ?? ''])[0]"""


class Page:
    """What a person sees and does, by the names that are on the page."""

    def __init__(self, driver, url):
        self.driver = driver
        driver.get("about:blank")
        driver.get(url)

    def wait(self, condition, what):
        from selenium.common.exceptions import StaleElementReferenceException, TimeoutException
        from selenium.webdriver.support.ui import WebDriverWait

        waiting = WebDriverWait(self.driver, WAIT_SECONDS, 0.05, [StaleElementReferenceException])
        try:
            return waiting.until(lambda _: condition())
        except TimeoutException:
            raise AssertionError("waited in vain: %s; the page says: %s" % (what, self.texts("#message, #alert, #counts")))

    def until(self, expression, what, *arguments):
        """The first value that counts as true of an expression with the arguments `a`. The page itself looks whenever something on it
        changes: asking again and again from here would take the time that the page needs."""
        script = """
            const [a, seconds, done] = [arguments[0], arguments[1], arguments[2]];
            const value = () => { try { return (%s); } catch (failure) { return null; } };
            const observer = new MutationObserver(() => look());
            const end = (answer) => { observer.disconnect(); clearTimeout(timer); removeEventListener("load", look, true); done(answer); };
            const look = () => { const found = value(); if (found) end([found]); };
            const timer = setTimeout(() => end(null), seconds * 1000);
            observer.observe(document, { subtree: true, childList: true, attributes: true, characterData: true });
            addEventListener("load", look, true);
            look();
        """
        found = self.driver.execute_async_script(script % expression, arguments, WAIT_SECONDS)
        if found is None:
            raise AssertionError("waited in vain: %s; the page says: %s" % (what, self.texts("#message, #alert, #counts")))
        return found[0]

    def find(self, selector):
        return self.driver.find_elements("css selector", selector)

    def one(self, selector):
        return self.until("[...document.querySelectorAll(a[0])].find((one) => one.checkVisibility({ checkVisibilityCSS: true }))", selector, selector)

    def press(self, selector):
        """Clicks what a person sees there, whatever is put in its place while the page goes on reading."""
        self.wait(lambda: self.one(selector).click() is None, "a press of " + selector)

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
        self.until("!document.querySelector('#fields-body[aria-busy]') && document.querySelector('#fields-body .quietly, #fields-body .why')", "the reading")
        return self

    def wait_for_picture(self):
        self.until("[document.querySelector('#stage img')].find((one) => one.complete && one.naturalWidth > 0)", "the picture")
        return self

    def choose(self, document):
        """Opens a document of the list by the mouse."""
        self.until("[...document.querySelectorAll('#list .row')].find((one) => one.innerText.startsWith(a[0]))", "the row of " + document, document).click()

    def field(self, name):
        """The state and the value that the field is shown with."""
        return self.run("const a = arguments; return " + FIELD, name)

    def wait_for_field(self, name, value):
        shown = "JSON.stringify(%s) === JSON.stringify(['\u2713 found', a[1]])" % FIELD
        self.until(shown, "the field %s as %r: %r" % (name, value, self.field(name)), name, value)

    def settings(self):
        """The settings as the editor has them."""
        return self.run("return " + SETTINGS)

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
