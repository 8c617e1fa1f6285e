"""The samples of docs/bundles.md, as they stand there."""

import os
import re
from pathlib import Path

TREE = Path(os.environ["SOURCE_TREE"])
DOCUMENT = TREE / "docs/bundles.md"


def samples(language: str) -> list[str]:
    """The contents of the document's code blocks in the language, in order."""
    text = DOCUMENT.read_text(encoding="utf-8")
    return re.findall(rf"^```{language}\n(.*?)^```$", text, re.MULTILINE | re.DOTALL)
