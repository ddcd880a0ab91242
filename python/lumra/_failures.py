# SPDX-License-Identifier: MIT
"""The exception of all failures that are not a wrong argument's."""


class Error(RuntimeError):
    """A failure that no argument alone is to blame for: too few samples, a damaged state, a file that cannot be read.

    Attributes
    ----------
    code : int
        The library's number for it, negative.
    """

    def __init__(self, message, code=-390099):
        super().__init__(message)
        self.code = code

    def __reduce__(self):
        return type(self), (str(self), self.code)


Error.__module__ = "lumra"
