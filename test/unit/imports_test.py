#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
#
# Checks what the module needs of the process that loads it: imports_test.py MODULE BINDING PLATFORM_HEADERS
#
# MODULE is the build without a platform. What it leaves undefined and no library that it names defines must be declared
# in the headers and exported by BINDING; and it may name no library but those of the C++ run-time and JSON.
import pathlib
import re
import subprocess
import sys

RUNTIME = re.compile(r"lib(c|m|stdc\+\+|gcc_s|pthread|jsoncpp|asan|ubsan|tsan)\.so|ld-linux|linux-vdso")


def output(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout


def symbols(path, choice):
    """The dynamic symbols of a library without their versions; choice: nm's option. Weak ones need nobody."""
    lines = (line.split() for line in output("nm", "-D", choice, path).splitlines())
    return {line[-1].split("@")[0] for line in lines if choice != "-u" or line[-2] == "U"}


def is_declared(name, headers):
    """True when some header declares the demangled symbol; by name, for its types are the compiler's to compare."""
    name = re.sub(r"<.*?>|\[abi:\w+\]|\(.*", "", name)
    name = re.sub(r"^(vtable|typeinfo|typeinfo name) for ", "", name)
    *scopes, last = name.split("::")
    if not scopes and re.search(rf"^(class|struct) LH_PLATFORM_API {last}\b", headers, re.M):
        return True
    if not scopes:
        return re.search(rf"^LH_PLATFORM_API [^;()]*\b{last}\b[(;]", headers, re.M) is not None
    body = re.search(rf"^(class|struct) LH_PLATFORM_API {scopes[-1]}\b.*?^}};", headers, re.M | re.S)
    return body is not None and re.search(rf"(?<!\w){last}\(", body[0]) is not None


def main(module, binding, platform):
    libraries = dict(re.findall(r"^\s*(\S+) (?:=> )?(\S*)", output("ldd", module), re.M))
    faults = [f"needs {name}" for name in libraries if not RUNTIME.search(name)]
    left = symbols(module, "-u").difference(
        *(symbols(path, "--defined-only") for path in libraries.values() if path.startswith("/")))
    exported = symbols(binding, "--defined-only")
    headers = "\n".join(path.read_text() for path in sorted(pathlib.Path(platform).rglob("*.h")))
    ordered = sorted(left)
    for symbol, name in zip(ordered, output("c++filt", *ordered).splitlines()):
        if not is_declared(name, headers):
            faults.append(f"not declared in platform/: {name}")
        elif symbol not in exported:
            faults.append(f"not exported by {pathlib.Path(binding).name}: {name}")
    if not left:
        faults.append("nothing is left to the platform: this is another build")
    print(*faults, f"{len(left)} symbols of the platform", sep="\n")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main(*sys.argv[1:]))
