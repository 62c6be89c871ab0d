"""The one exception of the package."""


class Error(Exception):
    """Says why a piece of work failed.

    Attributes:
        reason: one line that says what and where.
        command: the class of the command that failed; empty where none ran.
        step: the name of its step in the job document; empty likewise.
    """

    def __init__(self, reason, command="", step=""):
        super().__init__(reason, command, step)
        self.reason = reason
        self.command = command
        self.step = step

    def __str__(self):
        return f"{self.command}: {self.reason}" if self.command else self.reason
