"""The files by which this process proves who it is, and knows the servers: looked at before one is
asked, which could not tell what is wrong with them."""

import os
import ssl
import time
from contextlib import suppress
from typing import Any, Dict, NamedTuple, Optional

import ovs.stream

from vswitch.fabric._errors import UnusableFile

__all__ = ["Tls", "expired", "use"]

# OpenSSL has more flags than the module names in all of its versions.
_PARTIAL_CHAIN = 0x80000
_AT_ANY_TIME = 0x200000


class Tls(NamedTuple):
    """Files in PEM."""

    private_key: str
    certificate: str
    ca_cert: str


# As Open vSwitch's module has it, for all that this process connects to.
_used: Optional[Tls] = None


def use(tls: Tls) -> None:
    """From now on this process is known by that certificate. Raises UnusableFile."""
    global _used
    _check(tls)
    _used = tls
    stream = ovs.stream.Stream
    stream.ssl_set_private_key_file(tls.private_key)
    stream.ssl_set_certificate_file(tls.certificate)
    stream.ssl_set_ca_cert_file(tls.ca_cert)


def expired() -> str:
    """Which certificate of this process no server takes any longer, and since when: servers do not
    say. An empty text if it is none."""
    until = _read(_used).get("notAfter") if _used else None
    if _used is None or until is None or ssl.cert_time_to_seconds(until) > time.time():
        return ""
    return f"the certificate {_used.certificate} expired on {until}"


def _read(tls: Tls) -> Dict[str, Any]:
    """What the certificate says, if that can be read. The module tells it only of one that somebody
    shows, as this does to itself."""
    showing = ssl.SSLContext(ssl.PROTOCOL_TLS_CLIENT)
    showing.check_hostname = False
    showing.verify_mode = ssl.CERT_NONE
    looking = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
    looking.verify_mode = ssl.CERT_REQUIRED
    looking.verify_flags = ssl.VerifyFlags(_PARTIAL_CHAIN | _AT_ANY_TIME)
    to, back = ssl.MemoryBIO(), ssl.MemoryBIO()
    try:
        for context in showing, looking:
            context.load_cert_chain(tls.certificate, tls.private_key, password="")
        looking.load_verify_locations(tls.certificate)
        looked = looking.wrap_bio(to, back, server_side=True)
        left = [showing.wrap_bio(back, to), looked]
        for side in left * 2:
            with suppress(ssl.SSLWantReadError):
                side.do_handshake()
        return looked.getpeercert() or {}
    except (OSError, ValueError):
        return {}


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
