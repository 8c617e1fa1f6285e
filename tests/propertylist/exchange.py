"""Exchanges property lists with the reader and writer of Python's standard library, both ways.

    exchange.py PROGRAM COUNT SEED

PROGRAM is propertylist-exchange. COUNT random values are written by it and read here, and COUNT are
written here and read by it, half of them in each form.
"""

import base64
import datetime
import json
import math
import plistlib
import random
import struct
import subprocess
import sys

FORMS = {"binary": plistlib.FMT_BINARY, "xml": plistlib.FMT_XML}
START = datetime.datetime(2001, 1, 1)


def bits(real):
    return struct.pack("<d", real)


def equals(read, described):
    """Whether a value that was read here is the one that the program describes."""
    (kind, content), = described.items()
    if kind == "dict":
        return (isinstance(read, dict) and len(read) == len(content)
                and all(key in read and equals(read[key], value) for key, value in content))
    if kind == "array":
        return (isinstance(read, list) and len(read) == len(content)
                and all(equals(a, b) for a, b in zip(read, content)))
    if kind == "boolean":
        return read is content
    if kind == "integer":
        return type(read) is int and read == int(content)
    if kind == "real":
        return type(read) is float and bits(read) == bits(float.fromhex(content))
    if kind == "date":
        seconds = float.fromhex(content)
        return isinstance(read, datetime.datetime) and read == START + datetime.timedelta(seconds=seconds)
    if kind == "data":
        return isinstance(read, bytes) and read == base64.b64decode(content)
    return isinstance(read, str) and read == content


def describe(value):
    if isinstance(value, dict):
        return {"dict": [[key, describe(member)] for key, member in value.items()]}
    if isinstance(value, list):
        return {"array": [describe(member) for member in value]}
    if isinstance(value, bool):
        return {"boolean": value}
    if isinstance(value, int):
        return {"integer": str(value)}
    if isinstance(value, float):
        return {"real": value.hex()}
    if isinstance(value, datetime.datetime):
        return {"date": float((value - START) / datetime.timedelta(seconds=1)).hex()}
    if isinstance(value, bytes):
        return {"data": base64.b64encode(value).decode()}
    return {"string": value}


class RandomValues:
    def __init__(self, seed):
        self.random = random.Random(seed)

    def text(self, form):
        pieces = ["a", "Identifier", "<&>\"'", "\n\t", "ä", "日", "😀", "\ufeff", "é" * 20, "z" * 15]
        if form == "binary":
            pieces += ["\0", "\r", "\x1f", "\uffff"]
        return "".join(self.random.choices(pieces, k=self.random.randrange(6)))

    def real(self):
        # Never -0.0: the binary writer here stores it together with 0.0.
        special = [0.0, 1.5, 5e-324, 1.7976931348623157e308, math.inf, -math.inf]
        real = struct.unpack("<d", self.random.randbytes(8))[0]
        return self.random.choice(special + [real] * 6) if not math.isnan(real) else 1.0

    def leaf(self, form):
        kind = self.random.randrange(6)
        if kind == 0:
            number = self.random.getrandbits(64) >> self.random.randrange(64)
            return number if self.random.random() < 0.5 else -(number >> 1) - 1
        if kind == 1:
            return self.real()
        if kind == 2:
            return self.random.random() < 0.5
        if kind == 3:
            return (datetime.datetime(1, 1, 1)
                    + datetime.timedelta(seconds=self.random.randrange(315537897600)))
        if kind == 4:
            return self.random.randbytes(self.random.randrange(100))
        return self.text(form)

    def value(self, form, depth=0):
        kind = self.random.randrange(10)
        if depth == 5 or kind >= 4:
            return self.leaf(form)
        members = range(self.random.choice([0, 1, 2, 3, 20]) if depth < 3 else 2)
        if kind < 2:
            return [self.value(form, depth + 1) for _ in members]
        return {self.text(form): self.value(form, depth + 1) for _ in members}


def main():
    program, count, seed = sys.argv[1], int(sys.argv[2]), int(sys.argv[3])
    lines = subprocess.run([program, "write", str(count), str(seed)], check=True,
                           stdout=subprocess.PIPE, text=True).stdout.splitlines()
    if len(lines) != count:
        sys.exit(f"{len(lines)} lists were written, not {count}")
    for text in lines:
        line = json.loads(text)
        read = plistlib.loads(base64.b64decode(line["file"]), fmt=FORMS[line["form"]])
        if not equals(read, line["value"]):
            sys.exit(f"read here as {read!r}: {text}")

    values = RandomValues(seed)
    lines = []
    for i in range(count):
        form = "binary" if i % 2 == 0 else "xml"
        value = values.value(form)
        file = plistlib.dumps(value, fmt=FORMS[form], sort_keys=has_sorted_keys(i))
        lines.append(json.dumps({"form": form, "file": base64.b64encode(file).decode(),
                                 "value": describe(value)}))
    checked = subprocess.run([program, "check"], check=True, input="\n".join(lines) + "\n",
                             stdout=subprocess.PIPE, text=True).stdout
    if checked.strip() != str(count):
        sys.exit(f"{checked.strip()} lists were checked, not {count}")
    print(f"{count} lists read here, {count} lists read by the program")


def has_sorted_keys(i):
    """Every third file keeps its keys in the order in which they were made."""
    return i % 3 != 0


if __name__ == "__main__":
    main()
