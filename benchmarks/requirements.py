"""Requirements on measured figures."""


class Requirements:
    """Prints each comparison and remembers whether a requirement was missed."""

    def __init__(self):
        self.missed = 0

    def check(self, text, measured):
        """`measured` is a function that returns (met, figures); it raises KeyError if a figure is missing."""
        try:
            met, figures = measured()
        except KeyError as missing:
            self.miss(f"{text}: not measured: {missing}")
            return
        if self.accepts(met):
            print(f"  {self.heading()}  {text}: {figures}")
        else:
            self.miss(f"{text}: {figures}")

    def miss(self, text):
        self.missed += 1
        print(f"  FAIL  {text}")

    def accepts(self, met):
        return met

    def heading(self):
        return "PASS"

    def exit_code(self):
        """Prints a summary and returns whether a requirement was missed."""
        print("all requirements are met" if self.missed == 0 else f"{self.missed} requirements are missed")
        return 0 if self.missed == 0 else 1


class Figures(Requirements):
    """Only requires that the figures exist."""

    def accepts(self, met):
        return True

    def heading(self):
        return "    "

    def exit_code(self):
        print("all figures are there; none was judged" if self.missed == 0 else f"{self.missed} figures are missing")
        return 0 if self.missed == 0 else 1
