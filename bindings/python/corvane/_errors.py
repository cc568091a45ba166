"""Errors that the library reports."""


class Error(Exception):
    """Why the library has refused a call, or something has failed.

    `domain` and `code` name the error; `message` is for a person. The domain "Corvane.CError" is about calls: 0 and 1
    for an object that was closed or given out for the length of a callback, 3 and 4 for an argument, 5 for a call that
    waits inside a callback, 7 for what is in use. "Corvane.TrackerError" is about events, such as one that lacks data.
    """

    def __init__(self, domain: str, code: int, message: str) -> None:
        super().__init__(domain, code, message)
        self.domain = domain
        self.code = code
        self.message = message

    def __str__(self) -> str:
        return self.message


class ForkedError(Error):
    """The process was forked off one that had used the library, whose threads it does not have.

    Start such a process anew (multiprocessing's "spawn"), or fork before anything of the library is used: importing the
    package and declaring data and events does not use it.
    """


def error_of(domain: bytes, code: int, message: bytes) -> Error:
    kind = ForkedError if domain == b"Corvane.CError" and code == 6 else Error
    return kind(domain.decode(), code, message.decode(errors="replace"))
