"""Certificates for tests: authorities, and what they vouch for."""

import subprocess
from pathlib import Path
from typing import List, NamedTuple

_KEY = ["-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes"]


class Certificate(NamedTuple):
    """The files of a certificate and its key."""

    certificate: Path
    key: Path

    def options(self, trusted: Path) -> List[str]:
        """Of simhostd and of Open vSwitch's programs, who trust that authority."""
        files = {"private-key": self.key, "certificate": self.certificate, "ca-cert": trusted}
        return [f"--{name}={file}" for name, file in files.items()]


class Authority:
    """One that signs certificates."""

    def __init__(self, folder: Path, name: str) -> None:
        self._folder = folder / name
        self._folder.mkdir()
        self._own = self._files("authority")
        key, own = self._own.key, self._own.certificate
        openssl("req", "-x509", *_KEY, "-keyout", key, "-out", own, "-subj", f"/CN={name}")

    @property
    def certificate(self) -> Path:
        return self._own.certificate

    def issue(self, name: str, days: int = 30) -> Certificate:
        """One that expires after so many days, which may be past."""
        files = self._files(name)
        request = self._folder / f"{name}.request"
        openssl("req", "-new", *_KEY, "-keyout", files.key, "-out", request, "-subj", f"/CN={name}")
        signed_by = ["-CA", self._own.certificate, "-CAkey", self._own.key]
        written = ["-in", request, "-out", files.certificate]
        openssl("x509", "-req", *signed_by, *written, "-days", days)
        return files

    def _files(self, name: str) -> Certificate:
        return Certificate(self._folder / f"{name}.pem", self._folder / f"{name}.key")


def openssl(*words: object) -> None:
    command = ["openssl", *(str(word) for word in words)]
    subprocess.run(command, check=True, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
