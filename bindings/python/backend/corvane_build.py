"""Builds the Python package of Corvane: the library by CMake, and around it a wheel. A PEP 517 backend.

It needs CMake, a C++ compiler and the libraries that Corvane is made of; not a single Python package. In a checkout the
library's sources are above this package, and what is built is kept for the next time; a source distribution brings them along.
"""

import base64
import hashlib
import io
import os
import re
import shutil
import subprocess
import sysconfig
import tarfile
import tempfile
import zipfile
from pathlib import Path
from typing import Any, Dict, Iterator, List, Optional, Tuple

_here = Path(__file__).resolve().parent.parent
_bundled = _here / "library"
_root = _bundled if _bundled.is_dir() else _here.parent.parent
_settings = Optional[Dict[str, Any]]

# What of the library's tree it takes to build it.
_SOURCES = ("CMakeLists.txt", "LICENSE", "README.md", "cmake", "corvane")
_OWN = ("README.md", "backend", "corvane", "examples", "pyproject.toml")


def build_wheel(wheel_directory: str, config_settings: _settings = None, metadata_directory: Optional[str] = None) -> str:
    with tempfile.TemporaryDirectory() as place:
        files = list(_modules()) + list(_built(Path(place)))
        return _write_wheel(Path(wheel_directory), [(f"corvane/{name}", data, mode) for name, data, mode in files])


def build_editable(
    wheel_directory: str, config_settings: _settings = None, metadata_directory: Optional[str] = None
) -> str:
    """The package stays where it is, and the library is put into it."""
    with tempfile.TemporaryDirectory() as place:
        for name, data, mode in _built(Path(place)):
            file = _here / "corvane" / name
            file.parent.mkdir(exist_ok=True)
            replacement = file.with_suffix(".new")  # a process may run the one that is there
            replacement.write_bytes(data)
            replacement.chmod(mode)
            replacement.replace(file)
    return _write_wheel(Path(wheel_directory), [("corvane.pth", f"{_here}\n".encode(), 0o644)])


def prepare_metadata_for_build_wheel(metadata_directory: str, config_settings: _settings = None) -> str:
    directory = Path(metadata_directory) / _info_directory()
    directory.mkdir()
    for name, data, _ in _information():
        (directory / name).write_bytes(data)
    return directory.name


prepare_metadata_for_build_editable = prepare_metadata_for_build_wheel


def build_sdist(sdist_directory: str, config_settings: _settings = None) -> str:
    top = f"corvane-{_version()}"
    file = Path(sdist_directory) / f"{top}.tar.gz"
    with tarfile.open(file, "w:gz", format=tarfile.PAX_FORMAT) as archive:
        information = tarfile.TarInfo(f"{top}/PKG-INFO")
        information.size = len(_metadata())
        archive.addfile(information, io.BytesIO(_metadata()))
        for directory, prefix, names in ((_here, top, _OWN), (_root, f"{top}/library", _SOURCES)):
            for name in names:
                archive.add(directory / name, f"{prefix}/{name}", filter=_source)
    return file.name


def _source(entry: tarfile.TarInfo) -> Optional[tarfile.TarInfo]:
    """What belongs into a source distribution, without who packed it."""
    path = Path(entry.name)
    if path.name == "__pycache__" or path.parts[1:3] in (("corvane", "lib"), ("corvane", "libexec")):
        return None
    entry.uid = entry.gid = 0
    entry.uname = entry.gname = ""
    return entry


def _version() -> str:
    found = re.search(r"^project\(corvane VERSION (\S+)", (_root / "CMakeLists.txt").read_text(), re.MULTILINE)
    if not found:
        raise RuntimeError(f"{_root / 'CMakeLists.txt'} does not say which version this is")
    return found[1]


def _info_directory() -> str:
    return f"corvane-{_version()}.dist-info"


def _tag() -> str:
    """For this platform alone: the library is linked with the system's."""
    return "py3-none-" + re.sub(r"[-.]", "_", sysconfig.get_platform())


def _metadata() -> bytes:
    head = f"""Metadata-Version: 2.1
Name: corvane
Version: {_version()}
Summary: Records what users do and delivers it to a collection server
License: Apache-2.0
Requires-Python: >=3.9
Description-Content-Type: text/markdown

"""
    return (head + (_here / "README.md").read_text(encoding="utf-8")).encode()


def _information() -> Iterator[Tuple[str, bytes, int]]:
    yield "METADATA", _metadata(), 0o644
    wheel = f"Wheel-Version: 1.0\nGenerator: corvane_build\nRoot-Is-Purelib: false\nTag: {_tag()}\n"
    yield "WHEEL", wheel.encode(), 0o644
    yield "LICENSE", (_root / "LICENSE").read_bytes(), 0o644


def _modules() -> Iterator[Tuple[str, bytes, int]]:
    for file in sorted((_here / "corvane").iterdir()):
        if file.suffix == ".py" or file.name == "py.typed":
            yield file.name, file.read_bytes(), 0o644


def _run(*command: str) -> None:
    if not shutil.which(command[0]):
        raise RuntimeError(f"{command[0]} is missing; scripts/install-dependencies of the sources installs what it takes")
    subprocess.run(command, check=True)


def _built(temporary: Path) -> Iterator[Tuple[str, bytes, int]]:
    """Builds the library and the transfer agent, which the library finds from where it lies itself."""
    directory = temporary if _root == _bundled else _root / "build" / "python"
    options = {
        "CMAKE_BUILD_TYPE": "Release",
        "CMAKE_INSTALL_LIBDIR": "lib",
        "CMAKE_INSTALL_LIBEXECDIR": "libexec",
        "CMAKE_SHARED_LINKER_FLAGS": "-s",
        "CMAKE_EXE_LINKER_FLAGS": "-s",
        "CORVANE_BUILD_C_LIBRARY": "ON",
        "CORVANE_BUILD_EXAMPLES": "OFF",
        "CORVANE_BUILD_TESTING_LIBRARY": "OFF",
        "CORVANE_BUILD_TESTS": "OFF",
    }
    generator = ["-G", "Ninja"] if shutil.which("ninja") else []
    defined = [f"-D{name}={value}" for name, value in options.items()]
    _run("cmake", "--fresh", "-S", str(_root), "-B", str(directory), *generator, *defined)
    targets = ("--target", "corvane_c", "corvane-transferd")
    _run("cmake", "--build", str(directory), *targets, "--parallel", str(os.cpu_count() or 1))
    yield "lib/libcorvane_c.so", (directory / "corvane/c/libcorvane_c.so").read_bytes(), 0o755
    yield "libexec/corvane-transferd", (directory / "corvane/Agent/Daemon/corvane-transferd").read_bytes(), 0o755


def _write_wheel(directory: Path, files: List[Tuple[str, bytes, int]]) -> str:
    name = f"corvane-{_version()}-{_tag()}.whl"
    files = files + [(f"{_info_directory()}/{file}", data, mode) for file, data, mode in _information()]
    record = []
    with zipfile.ZipFile(directory / name, "w", zipfile.ZIP_DEFLATED) as wheel:
        for file, data, mode in files:
            digest = base64.urlsafe_b64encode(hashlib.sha256(data).digest()).rstrip(b"=").decode()
            record.append(f"{file},sha256={digest},{len(data)}\n")
            _add(wheel, file, data, mode)
        list_of_all = f"{_info_directory()}/RECORD"
        _add(wheel, list_of_all, ("".join(record) + f"{list_of_all},,\n").encode(), 0o644)
    return name


def _add(wheel: zipfile.ZipFile, name: str, data: bytes, mode: int) -> None:
    entry = zipfile.ZipInfo(name)  # of 1980, so that the same sources give the same wheel
    entry.compress_type = zipfile.ZIP_DEFLATED
    entry.external_attr = (0o100000 | mode) << 16
    wheel.writestr(entry, data)
