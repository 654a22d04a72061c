"""The files by which this process proves who it is, and knows the servers: looked at before one is
asked, which could not tell what is wrong with them."""

import os
import ssl
from typing import NamedTuple

import ovs.stream

from vswitch.fabric._errors import UnusableFile

__all__ = ["Tls", "use"]


class Tls(NamedTuple):
    """Files in PEM."""

    private_key: str
    certificate: str
    ca_cert: str


def use(tls: Tls) -> None:
    """From now on this process is known by that certificate. Raises UnusableFile."""
    _check(tls)
    stream = ovs.stream.Stream
    stream.ssl_set_private_key_file(tls.private_key)
    stream.ssl_set_certificate_file(tls.certificate)
    stream.ssl_set_ca_cert_file(tls.ca_cert)


def _check(tls: Tls) -> None:
    for name, file in tls._asdict().items():
        try:
            with open(file, "rb"):
                pass
        except OSError as why:
            raise UnusableFile(name, file, os.strerror(why.errno or 0)) from None
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_CLIENT)
    for name in ("certificate", "ca_cert"):
        file = getattr(tls, name)
        try:
            context.load_verify_locations(file)
        except ssl.SSLError:
            raise UnusableFile(name, file, "it has no certificate") from None
    try:
        # Nobody is there to be asked for a password.
        context.load_cert_chain(tls.certificate, tls.private_key, password="")
    except ssl.SSLError as why:
        is_other = why.reason in ("KEY_VALUES_MISMATCH", "KEY_TYPE_MISMATCH")
        said = f"it is not the key of the certificate {tls.certificate}" if is_other else _NO_KEY
        raise UnusableFile("private_key", tls.private_key, said) from None


_NO_KEY = "it has no private key that can be read without a password"
