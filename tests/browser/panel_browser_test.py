"""The panel in headless Chromium: every step a person takes, waited for as a person waits, with a
screenshot of each in the directory given.

    panel_browser_test.py URL SHOTS
URL is the one fileindex-panel printed (with its token)."""
import os
import sys
import tempfile
import urllib.parse

from selenium import webdriver
from selenium.webdriver.chrome.service import Service
from selenium.common.exceptions import StaleElementReferenceException
from selenium.webdriver.common.by import By
from selenium.webdriver.support import expected_conditions as shown
from selenium.webdriver.support.ui import Select, WebDriverWait

url, shots = sys.argv[1], sys.argv[2]
base = url.split("?")[0]


def browser(profile):
    options = webdriver.ChromeOptions()
    options.binary_location = "/usr/bin/chromium"
    for flag in ("--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
                 "--disable-background-networking", "--disable-component-update", "--disable-sync",
                 "--disable-dev-shm-usage", "--window-size=1280,900", "--user-data-dir=" + profile):
        options.add_argument(flag)
    return webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)


def shot(driver, name):
    driver.save_screenshot(os.path.join(shots, name + ".png"))


def row(driver, path):
    """The folder table's row of path, or None."""
    for candidate in driver.find_elements(By.CSS_SELECTOR, "#folders tbody tr"):
        if candidate.find_element(By.CSS_SELECTOR, "td.path").text == path:
            return candidate
    return None


def state_of(driver, path):
    found = row(driver, path)
    return found.find_element(By.CSS_SELECTOR, "td.state .badge").get_attribute("data-state") if found else None


with tempfile.TemporaryDirectory() as profile:
    driver = browser(profile)
    # The table is rebuilt as the state changes: an element that went stale is looked up again.
    wait = WebDriverWait(driver, 20, poll_frequency=0.1, ignored_exceptions=[StaleElementReferenceException])
    try:
        # Without the token: refused.
        driver.get(base)
        assert "needs the panel's token" in driver.find_element(By.TAG_NAME, "body").text
        assert not driver.find_elements(By.ID, "folders")
        shot(driver, "1-without-token")

        # With it: the token leaves the address bar, and the folder table shows.
        driver.get(url)
        wait.until(lambda d: d.find_element(By.TAG_NAME, "body").get_attribute("data-first-table-milliseconds"))
        assert driver.current_url == base, driver.current_url
        first_table = driver.find_element(By.TAG_NAME, "body").get_attribute("data-first-table-milliseconds")
        print("first folder table shown after %s ms" % first_table)
        with open(os.path.join(shots, "first-table-milliseconds.txt"), "w") as out:
            out.write(first_table + "\n")
        wait.until(lambda d: d.find_element(By.ID, "overall").text == "finished")
        shot(driver, "2-empty")

        # A recycle-bin path is refused while it is typed, before anything is saved.
        path = driver.find_element(By.ID, "add-path")
        path.send_keys("/photo/#recycle")
        wait.until(shown.text_to_be_present_in_element((By.ID, "add-check"), "in a share's recycle bin"))
        shot(driver, "3-refused-path")

        # Add a folder: processing while the stand-in daemon works through its queue, then finished.
        path.clear()
        path.send_keys("/photo/holiday")
        wait.until(shown.text_to_be_present_in_element((By.ID, "add-check"), "May be indexed"))
        driver.find_element(By.ID, "add-name").send_keys("Holiday")
        driver.find_element(By.ID, "add").click()
        wait.until(lambda d: state_of(d, "/photo/holiday") == "processing")
        shot(driver, "4-processing")
        wait.until(lambda d: state_of(d, "/photo/holiday") == "finished")
        photos = "input[aria-label='Photos for /photo/holiday']"
        assert row(driver, "/photo/holiday").find_element(By.CSS_SELECTOR, photos).is_selected()
        shot(driver, "5-finished")

        # Pause for an hour: the page says when indexing resumes; then resume.
        Select(driver.find_element(By.ID, "pause-length")).select_by_visible_text("for 1 hour")
        driver.find_element(By.ID, "pause").click()
        wait.until(shown.text_to_be_present_in_element((By.ID, "pause-text"), "resumes at"))
        assert driver.find_element(By.ID, "paused").is_displayed()
        shot(driver, "6-paused")
        driver.find_element(By.ID, "resume").click()
        wait.until(lambda d: d.find_element(By.ID, "pause-text").text == "" and
                   not d.find_element(By.ID, "paused").is_displayed())

        # A phone-width window still shows every folder's controls.
        driver.set_window_size(390, 844)
        driver.execute_script("document.getElementById('folders-heading').scrollIntoView()")
        shot(driver, "7-phone")
        driver.set_window_size(1280, 900)

        # Remove the folder, confirming in the dialog.
        row(driver, "/photo/holiday").find_element(By.CSS_SELECTOR, "button.danger").click()
        wait.until(lambda d: d.find_element(By.ID, "confirm-remove").is_displayed())
        driver.find_element(By.ID, "confirm-remove-yes").click()
        wait.until(lambda d: row(d, "/photo/holiday") is None and d.find_element(By.ID, "no-folders").is_displayed())
        shot(driver, "8-removed")
        print("panel browser test: every step passed")
    except Exception:
        shot(driver, "failed")
        print(driver.find_element(By.TAG_NAME, "body").text, file=sys.stderr)
        raise
    finally:
        driver.quit()
