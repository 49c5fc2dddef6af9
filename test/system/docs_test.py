# SPDX-License-Identifier: Apache-2.0
#
# Runs the examples of docs/api/: each answer must have the status, the keys and the types that its page shows.
import re
import unittest
import json

from installation import PASSWORDS, ROOT, Installation

EXAMPLE = re.compile(r"```request(?: as (\w+))?\n(.*?)```\s*```answer (\d+)(?: (\S+))?\n(.*?)```", re.S)


def shape(value):
    """Keys and types; of a list, those of its first element."""
    if isinstance(value, dict):
        return {key: shape(inner) for key, inner in value.items()}
    if isinstance(value, list):
        return [shape(value[0])] if value else []
    return type(value).__name__


class DocsTest(unittest.TestCase):
    def test_examples(self):
        ran = 0
        with Installation() as server:
            for page in sorted((ROOT / "docs/api").glob("*.md")):
                for account, request, status, kind, shown in EXAMPLE.findall(page.read_text()):
                    line, _, body = request.strip().partition("\n")
                    body = body.replace("$ADMIN_PASSWORD", PASSWORDS["admin"].replace(" ", "+"))
                    method, target = line.split(" ", 1)
                    # A session for each, since one example logs out.
                    headers = {"Cookie": f"id={server.login(account)}"} if account else {}
                    headers["Content-Type"] = "application/x-www-form-urlencoded"
                    with self.subTest(page=page.name, request=line):
                        ran += 1
                        connection, response = server.open(
                            target.partition("?")[2], headers=headers, body=body if method == "POST" else None, method=method
                        )
                        self.assertEqual(response.status, int(status))
                        if kind:
                            self.assertEqual(response.headers.get_content_type(), kind)
                        else:
                            self.assertEqual(shape(json.loads(response.read())), shape(json.loads(shown)))
                        connection.close()
        self.assertGreaterEqual(ran, 8)


if __name__ == "__main__":
    unittest.main()
