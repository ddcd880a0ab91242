# SPDX-License-Identifier: MIT
# The extension module, whose functions are called by the package alone.
from typing import Any

def __getattr__(name: str) -> Any: ...
