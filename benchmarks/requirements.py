"""What is required of measured figures."""


class Requirements:
    """Prints each comparison and remembers whether one was missed."""

    def __init__(self):
        self.missed = 0

    def check(self, text, measured):
        """`measured` is a function that returns (met, figures); without a figure it raises KeyError."""
        try:
            met, figures = measured()
        except KeyError as missing:
            met, figures = False, f"not measured: {missing}"
        self.missed += 0 if met else 1
        print(f"  {'PASS' if met else 'FAIL'}  {text}: {figures}")

    def exit_code(self):
        """Says in words, too, whether one was missed."""
        print("all requirements are met" if self.missed == 0 else f"{self.missed} requirements are missed")
        return 0 if self.missed == 0 else 1
