"""A support person at the feedback desk: reads the pages and answers through their forms."""

import html.parser
import http.cookiejar
import json
import urllib.parse
import urllib.request


class _Forms(html.parser.HTMLParser):
    """Hidden fields and pictures of a page."""

    def __init__(self):
        super().__init__()
        self.hidden = {}
        self.pictures = []
        self.links = []

    def handle_starttag(self, tag, attributes):
        values = dict(attributes)
        if tag == "input" and values.get("type") == "hidden":
            self.hidden[values["name"]] = values["value"]
        if tag == "img":
            self.pictures.append(values["src"])
        if tag == "a":
            self.links.append(values.get("href", ""))


class StaffDesk:
    def __init__(self, address, token):
        self.address, self.token = address, token
        jar = http.cookiejar.CookieJar()
        self.browser = urllib.request.build_opener(urllib.request.HTTPCookieProcessor(jar))
        self._post("/staff/login", token=token)

    def _request(self, path, data=None, **headers):
        request = urllib.request.Request(self.address + path, data, {"Origin": self.address, **headers})
        with self.browser.open(request, timeout=20) as answer:
            return answer.read()

    def _post(self, path, **fields):
        return self._request(path, urllib.parse.urlencode(fields).encode())

    def page(self, path="/staff"):
        return self._request(path).decode()

    def reports(self):
        """What the staff's programs read: newest first."""
        answer = self._request("/api/v1/staff/reports", Authorization="Bearer " + self.token)
        return json.loads(answer)["reports"]

    def report(self, number):
        return json.loads(self._request(f"/api/v1/staff/reports/{number}", Authorization="Bearer " + self.token))

    def find(self, title):
        """The complete report with this title, or None."""
        number = next((r["id"] for r in self.reports() if r["title"] == title), None)
        report = self.report(number) if number else None
        return report if report and report["complete"] else None

    def pictures(self, number):
        """The pictures that the report's page shows, as bytes."""
        forms = _Forms()
        forms.feed(self.page(f"/staff/reports/{number}"))
        return [self._request(path) for path in forms.pictures]

    def answer(self, number, status, reply):
        forms = _Forms()
        forms.feed(self.page(f"/staff/reports/{number}"))
        self._post(f"/staff/reports/{number}/answers", status=status, reply=reply, **forms.hidden)
