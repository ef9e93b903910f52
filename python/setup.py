"""Builds the tiktal package.

The package's attributes and enumerations (tiktal/_attributes.py) are not in the source: the build
writes them from the library's tables, ../src/tables, with the library's own generator,
../tools/codegen/gen.py, the same code that writes the C++ tables from them. So the package is
built from the libtiktal source tree (pip install ./python), and always matches the library built
beside it. The version is the library's, from ../CMakeLists.txt.
"""
import re
import runpy
from pathlib import Path

from setuptools import setup
from setuptools.command.build_py import build_py

SOURCE_TREE = Path(__file__).resolve().parent.parent
GENERATOR = SOURCE_TREE / "tools" / "codegen" / "gen.py"
TABLES = SOURCE_TREE / "src" / "tables"


def generate_attributes():
    """The text of tiktal/_attributes.py, from tools/codegen/gen.py run on the tables."""
    if not GENERATOR.is_file() or not TABLES.is_dir():
        raise SystemExit(f"tiktal: build the package inside the libtiktal source tree: it needs {GENERATOR} "
                         f"and {TABLES}")
    generator = runpy.run_path(str(GENERATOR), run_name="tiktal_codegen")
    return generator["gen_python_attributes"](str(TABLES))


class BuildPyWithAttributes(build_py):
    """build_py that also writes tiktal/_attributes.py into the build folder."""

    def run(self):
        super().run()
        target = Path(self.build_lib) / "tiktal" / "_attributes.py"
        self.announce(f"generating {target} from {TABLES}", level=2)
        if not self.dry_run:
            target.parent.mkdir(parents=True, exist_ok=True)
            target.write_text(generate_attributes(), encoding="utf-8")

    def get_outputs(self, include_bytecode=True):
        return super().get_outputs(include_bytecode) + [str(Path(self.build_lib) / "tiktal" / "_attributes.py")]


def version():
    text = (SOURCE_TREE / "CMakeLists.txt").read_text(encoding="utf-8")
    found = re.search(r"project\(tiktal VERSION (\d+(?:\.\d+)*)", text)
    if not found:
        raise SystemExit(f"tiktal: no version in {SOURCE_TREE / 'CMakeLists.txt'}")
    return found.group(1)


setup(version=version(), cmdclass={"build_py": BuildPyWithAttributes})
