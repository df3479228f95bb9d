"""A collector: takes requests of OTLP over HTTP, and keeps what a ClickHouse exporter would write.

Two things go wrong, as they do in a fleet. The answer to a request gets lost after its rows were written, so
that the sender sends the events again. And one kind of event is rejected, and told as a partial success.
"""
import gzip
import http.server
import json
import sys
import threading

import rows

REJECTED_EVENT = "A100|rejected"


class Collector(http.server.ThreadingHTTPServer):
    daemon_threads = True

    def __init__(self, port):
        super().__init__(("127.0.0.1", port), Handler)
        self.lock = threading.Lock()
        self.batches = []  # of rows, one for each request
        self.requests = []
        self.rejected = 0
        self.loses_next_answer = True
        self.complaints = []
        threading.Thread(target=self.serve_forever, daemon=True).start()

    def handle_error(self, request, client_address):
        """A connection that breaks is no error here: the service is stopped while one is open."""
        if not isinstance(sys.exc_info()[1], ConnectionError):
            super().handle_error(request, client_address)

    def take(self, request):
        """Writes the rows, and returns how many records it rejected; None when the answer is to be lost."""
        batch = [rows.row(*each) for each in rows.records(request)]
        good = [row for row in batch if row["LogAttributes"]["metrik.event"] != REJECTED_EVENT]
        with self.lock:
            self.requests.append(request)
            self.batches.append(good)
            lost, self.loses_next_answer = self.loses_next_answer, False
            if lost:
                return None
            self.rejected += len(batch) - len(good)
        return len(batch) - len(good)


class Handler(http.server.BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"

    def do_POST(self):
        body = self.rfile.read(int(self.headers["Content-Length"]))
        expected = ("/v1/logs", "application/json", "gzip")
        got = (self.path, self.headers["Content-Type"], self.headers["Content-Encoding"])
        if got != expected:
            self.server.complaints.append(f"a request was {got}, and not {expected}")
        rejected = self.server.take(json.loads(gzip.decompress(body)))
        if rejected is None:
            self.close_connection = True
            return
        partial = {"rejectedLogRecords": str(rejected), "errorMessage": "an event of no use"}
        self.answer(json.dumps({"partialSuccess": partial} if rejected else {}).encode())

    def answer(self, body):
        self.send_response(200)
        self.send_header("Content-Type", "application/json")
        self.send_header("Content-Length", str(len(body)))
        self.end_headers()
        self.wfile.write(body)

    def log_message(self, *_):
        pass
