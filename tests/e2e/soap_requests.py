"""Requests, as a JSON client writes their parameters, turned into SOAP messages."""

import re
from xml.sax.saxutils import escape

WITHOUT_SOAP = ["GetDiskGroups"]
ENVELOPE = ('<e:Envelope xmlns:e="http://schemas.xmlsoap.org/soap/envelope/" '
            'xmlns:i="http://www.w3.org/2001/XMLSchema-instance"><e:Body>'
            '<{0} xmlns="urn:nox">{1}</{0}></e:Body></e:Envelope>')
NOT_IN_XML = re.compile("[^\t\n\r\u0020-\ud7ff\ue000-\ufffd\U00010000-\U0010ffff]")


def is_soap(operation, parameters):
    """Whether the request can be said in SOAP."""
    return operation not in WITHOUT_SOAP and not NOT_IN_XML.search(str_of(parameters))


def str_of(value):
    """All texts of a request."""
    if isinstance(value, dict):
        return "".join(map(str_of, value.values()))
    return "".join(map(str_of, value)) if isinstance(value, list) else str(value)


def soap(operation, parameters):
    return ENVELOPE.format(operation, "".join(element(key, value) for key, value in parameters.items()))


def element(key, value):
    if isinstance(value, list):
        return "".join(element(key, one) for one in value)
    if key in ("disks", "ssd", "nonSsd"):
        value = value if isinstance(value, dict) else {"canonicalName": value}
        flag = f"<ssd>{str(value['ssd']).lower()}</ssd>" if "ssd" in value else ""
        name = f"<canonicalName>{quoted(value['canonicalName'])}</canonicalName>" if "canonicalName" in value else ""
        return (f"<{key}><deviceName/><deviceType/><uuid/>{name}<lunType/>"
                f"<capacity><blockSize>512</blockSize><block>1</block></capacity>{flag}</{key}>")
    if isinstance(value, dict):
        return f"<{key}>" + "".join(element(*one) for one in value.items()) + f"</{key}>"
    return f"<{key}>{quoted(str(value))}</{key}>"


def quoted(text):
    return escape(text, {"\n": "&#10;", "\r": "&#13;", "\t": "&#9;"})
