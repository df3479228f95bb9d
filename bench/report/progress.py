"""The bar that shows how far the work is. On the terminal only: a log gets a line for each step."""
import sys
import time

WIDTH = 24


class Progress:
    """`expected` names each step with the seconds that it usually takes."""

    def __init__(self, expected):
        self.total = sum(expected.values())
        self.expected = expected
        self.done = 0
        self.begin = time.monotonic()
        self.on_terminal = sys.stderr.isatty()

    def step(self, name):
        """For `with`."""
        self.name = name
        self.tell("")
        return self

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.done += self.expected[self.name]

    def tell(self, detail):
        """What the step is at."""
        part = self.done / self.total
        text = f"{self._clock()} {part:4.0%} {self.name}{': ' + detail if detail else ''}"
        if self.on_terminal:
            bar = "#" * round(part * WIDTH)
            sys.stderr.write(f"\r\x1b[K[{bar:.<{WIDTH}}] {text}"[:200])
        else:
            sys.stderr.write(text + "\n")
        sys.stderr.flush()

    def finish(self):
        if self.on_terminal:
            sys.stderr.write("\r\x1b[K")

    def _clock(self):
        seconds = int(time.monotonic() - self.begin)
        return f"{seconds // 60}:{seconds % 60:02} of about {round(self.total / 60) or 1} min"
