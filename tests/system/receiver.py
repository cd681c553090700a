"""An HTTP server that receives what sinks send."""

import json
import socket
import ssl
import threading
import time
from http.server import BaseHTTPRequestHandler, ThreadingHTTPServer


def free_port():
    """A port of this machine on which nobody listens; for programs that cannot choose one."""
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


class Request:
    """What was sent, and when its answer was given."""

    def __init__(self, path, headers, body):
        self.path = path
        self.headers = headers
        self.body = body
        self.json = json.loads(body)


class Receiver:
    """Keeps every request that it answers with a status of 2xx; `answer` may be replaced.

    `answer(request)` gives the status, or the status and a body; what it raises breaks the
    connection off.
    """

    def __init__(self, port=0, certificate=None, old_ciphers=None):
        self.taken = []
        self.refused = []
        self.answer = lambda request: 200
        receiver = self

        class Handler(BaseHTTPRequestHandler):
            protocol_version = "HTTP/1.1"

            def do_POST(self):
                body = self.rfile.read(int(self.headers["Content-Length"]))
                request = Request(self.path, self.headers, body)
                try:
                    answer = receiver.answer(request)
                except ConnectionError:
                    self.close_connection = True
                    return
                status, text = answer if isinstance(answer, tuple) else (answer, b"")
                (receiver.taken if 200 <= status < 300 else receiver.refused).append(request)
                self.send_response(status)
                self.send_header("Content-Length", str(len(text)))
                self.end_headers()
                self.wfile.write(text)

            def log_message(self, *arguments):
                pass

        ThreadingHTTPServer.allow_reuse_address = True
        self._server = ThreadingHTTPServer(("127.0.0.1", port), Handler)
        self._server.daemon_threads = True
        self.port = self._server.server_address[1]
        scheme = "http"
        if certificate:
            context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
            context.load_cert_chain(*certificate)
            if old_ciphers:
                context.maximum_version = ssl.TLSVersion.TLSv1_2
                context.set_ciphers(old_ciphers)
            self._server.socket = context.wrap_socket(
                self._server.socket, server_side=True, do_handshake_on_connect=False
            )
            scheme = "https"
        self.url = f"{scheme}://127.0.0.1:{self.port}"
        self._server.handle_error = lambda *arguments: None
        self._thread = threading.Thread(target=self._server.serve_forever, args=(0.05,))
        self._thread.start()

    def events(self):
        """The events of all accepted requests, in order."""
        return [event for request in list(self.taken) for event in request.json["events"]]

    def close(self):
        self._server.shutdown()
        self._thread.join()
        self._server.server_close()

    def __enter__(self):
        return self

    def __exit__(self, *exception):
        self.close()


def slowly(seconds):
    """An answer that comes late."""

    def answer(request):
        time.sleep(seconds)
        return 200

    return answer
