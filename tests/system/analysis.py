"""Questions to a running agent about its situations: explanations and backtests."""

from api import Api


class Analysis(Api):
    """A client that asks them."""

    def post(self, what, body, status=200):
        got, _, answer = self.request("POST", f"/api/v1/{what}", body)
        assert got == status, answer
        return answer

    def explain(self, **body):
        return self.post("explain", body)["explanations"]

    def explain_line(self, line, where, /, **definition):
        return self.explain(definition=definition, line=line.rstrip("\n"), log=str(where))[0]

    def backtest(self, begin, end, **body):
        return self.post("backtest", {"from": begin, "to": end, **body})

    def make(self, name, **fields):
        return self.post("situations", {"name": name, **fields}, 201)

    def counts(self, name):
        status, _, answer = self.request("GET", f"/api/v1/situations/{name}")
        assert status == 200, answer
        return answer["counts"]
