"""Compares what was found with what was expected, and counts."""


class Checks:
    def __init__(self):
        self.passed = self.failed = 0

    def __call__(self, what, got, expected):
        if got == expected:
            self.passed += 1
            return
        self.failed += 1
        if isinstance(got, dict) and isinstance(expected, dict):
            differ = [key for key in {**got, **expected} if got.get(key) != expected.get(key)]
            got, expected = ({key: each.get(key) for key in differ} for each in (got, expected))
        print(f"FAILED: {what}\n  got      {got}\n  expected {expected}")


expect = Checks()
