#!/usr/bin/env python3
"""Writes what is in a release, and which known weaknesses reach it: SPDX, CycloneDX and OpenVEX.

usage: documents.py VERSION SECONDS FOLDER [JQUERY]

SECONDS is the time of the release since the epoch. FOLDER is that of the release, with the source archive and
tools.txt, the list of the packages that it was built with. JQUERY is the script that Doxygen has put into the
web pages, if they were made. The runtime's version and checksum are those of runtime/get, the weaknesses those
of SECURITY.md's table.
"""

import datetime
import hashlib
import json
import pathlib
import re
import sys
import uuid

ROOT = pathlib.Path(__file__).resolve().parent.parent
NAME = "qel-message-protosvc"
LIBRARY_LICENCE = "LicenseRef-none-yet"
NOT_AFFECTED = {"component_not_present", "vulnerable_code_not_present",
                "vulnerable_code_not_in_execute_path",
                "vulnerable_code_cannot_be_controlled_by_adversary", "inline_mitigations_already_exist"}


def runtime():
    """Version and SHA-256 of the source of Protocol Buffers."""
    text = (ROOT / "runtime/get").read_text()
    return re.search(r"protobuf2_([\d.]+)\.orig", text)[1], re.search(r"sha256=(\w{64})", text)[1]


def part(of, name, version, licence, purl, cpe, comment, sha256=""):
    """A component of others, and which of our packages it is of."""
    return {"of": of, "name": name, "version": version, "licence": licence, "purl": purl, "sha256": sha256,
            "cpe": cpe and f"cpe:2.3:a:{cpe}:{version}:*:*:*:*:*:*:*", "comment": comment}


def components(tools, jquery):
    """What our packages contain of others, or need."""
    version, sha256 = runtime()
    yield part("libqel-message-protosvc1", "Protocol Buffers", version, "BSD-3-Clause",
               f"pkg:github/protocolbuffers/protobuf@v{version}", "google:protobuf",
               "The runtime, linked dynamically. It is in the packages for workstations and emulators; a "
               "device has its own. Its compiler has made the schema's classes.", sha256)
    for of, name, package, licence, cpe, comment in (
            ("qel-wire", "JSON for Modern C++", "nlohmann-json3-dev", "MIT", "nlohmann:json",
             "Compiled into the program."),
            ("qel-wire", "Nettle", "libnettle8", "LGPL-3.0-or-later OR GPL-2.0-or-later",
             "nettle_project:nettle", "Linked dynamically."),
            ("qel-wire", "CLI11", "libcli11-dev", "BSD-3-Clause", "", "Compiled into the program."),
            ("qel-message-testkit", "CLI11", "libcli11-dev", "BSD-3-Clause", "", "Compiled into the program."),
            ("qel-wire", "libpcap", "libpcap0.8", "BSD-3-Clause", "tcpdump:libpcap", "Linked dynamically."),
            ("qel-wire", "utf8proc", "libutf8proc2", "MIT", "", "Linked dynamically."),
            ("libqel-message-protosvc-doc", "Doxygen Awesome", "doxygen-awesome-css", "MIT", "",
             "The style of the web pages.")):
        found = re.search(rf"^({package}\w*)(?::\w+)? (\S+)$", tools, re.M)
        if not found:
            sys.exit(f"no package {package} in tools.txt")
        yield part(of, name, re.split(r"[-+]", found[2])[0], licence,
                   f"pkg:deb/debian/{found[1]}@{found[2].replace('+', '%2B')}", cpe, comment)
    if jquery:
        version = re.search(r"jQuery v([\d.]+)", pathlib.Path(jquery).read_text(encoding="utf-8"))[1]
        yield part("libqel-message-protosvc-doc", "jQuery", version, "MIT", f"pkg:npm/jquery@{version}",
                   "jquery:jquery", "In the web pages.")


def weaknesses():
    """Id, status, and reason of each weakness that has an id."""
    table = (ROOT / "SECURITY.md").read_text(encoding="utf-8").split("\n## Known weaknesses")[1]
    for line in re.findall(r"^\| \d+ \|.*", table, re.M):
        _, weakness, status, reason, checked_by = (cell.strip() for cell in line.strip("| ").split(" | "))
        status = status.strip("`")
        if status != "affected" and status not in NOT_AFFECTED:
            sys.exit(f"SECURITY.md: no status of OpenVEX: {status}")
        for name in re.findall(r"CVE-\d+-\d+", weakness):
            yield name, status, f"{reason} Checked by {checked_by}.".replace("`", "")


def purl(version):
    return f"pkg:generic/{NAME}@{version.replace('+', '%2B')}"


def owners(parts):
    """Our packages that have parts."""
    return sorted({part["of"] for part in parts})


def spdx(version, time, archive, parts):
    def package(identifier, name, number, licence, more):
        return {"SPDXID": identifier, "name": name, "versionInfo": number, "filesAnalyzed": False,
                "downloadLocation": "NOASSERTION", "licenseConcluded": licence, "licenseDeclared": licence,
                "copyrightText": "NOASSERTION", **more}

    def reference(category, kind, locator):
        return {"referenceCategory": category, "referenceType": kind, "referenceLocator": locator}

    def relation(subject, kind, other):
        return {"spdxElementId": subject, "relationshipType": kind, "relatedSpdxElement": other}

    def checksum(sha256):
        return {"checksums": [{"algorithm": "SHA256", "checksumValue": sha256}]} if sha256 else {}

    packages = [package("SPDXRef-source", NAME, version, LIBRARY_LICENCE, {
        **checksum(archive), "externalRefs": [reference("PACKAGE-MANAGER", "purl", purl(version))]})]
    relations = [relation("SPDXRef-DOCUMENT", "DESCRIBES", "SPDXRef-source")]
    for owner in owners(parts):
        packages.append(package(f"SPDXRef-{owner}", owner, version, LIBRARY_LICENCE, {}))
        relations.append(relation(f"SPDXRef-{owner}", "GENERATED_FROM", "SPDXRef-source"))
    for number, each in enumerate(parts):
        references = [reference("PACKAGE-MANAGER", "purl", each["purl"])]
        if each["cpe"]:
            references.append(reference("SECURITY", "cpe23Type", each["cpe"]))
        packages.append(package(f"SPDXRef-{number}", each["name"], each["version"], each["licence"], {
            **checksum(each["sha256"]), "comment": each["comment"], "externalRefs": references}))
        relations.append(relation(f"SPDXRef-{each['of']}", "DEPENDS_ON", f"SPDXRef-{number}"))
    return {"spdxVersion": "SPDX-2.3", "dataLicense": "CC0-1.0", "SPDXID": "SPDXRef-DOCUMENT",
            "name": f"{NAME}-{version}",
            "documentNamespace": uuid.uuid5(uuid.NAMESPACE_OID, purl(version)).urn,
            "creationInfo": {"created": time, "creators": [f"Tool: {NAME}-{version}"]},
            "hasExtractedLicensingInfos": [
                {"licenseId": LIBRARY_LICENCE,
                 "extractedText": "The owner has granted no licence yet: see packaging/debian/copyright."}],
            "packages": packages, "relationships": relations}


def cyclonedx(version, time, archive, parts):
    def component(name, number, licence, sha256="", **more):
        return {"type": "library", "bom-ref": name, "name": name, "version": number, "licenses": [licence],
                **({"hashes": [{"alg": "SHA-256", "content": sha256}]} if sha256 else {}), **more}

    ours = {"license": {"name": "none yet"}}
    return {"bomFormat": "CycloneDX", "specVersion": "1.5", "version": 1,
            "serialNumber": uuid.uuid5(uuid.NAMESPACE_OID, purl(version)).urn,
            "metadata": {"timestamp": time,
                         "component": component(NAME, version, ours, archive, purl=purl(version))},
            "components": [
                *(component(owner, version, ours) for owner in owners(parts)),
                *(component(each["name"], each["version"], {"expression": each["licence"]}, each["sha256"],
                            purl=each["purl"], description=each["comment"],
                            **({"cpe": each["cpe"]} if each["cpe"] else {}))
                  for each in {each["name"]: each for each in parts}.values())],  # some are in two packages
            "dependencies": [
                {"ref": NAME, "dependsOn": owners(parts)},
                *({"ref": owner, "dependsOn": [each["name"] for each in parts if each["of"] == owner]}
                  for owner in owners(parts))]}


def openvex(version, time, _, parts):
    product = {"@id": purl(version), "subcomponents": [{"@id": parts[0]["purl"]}]}

    def statement(name, status, reason):
        found = ({"status": "affected", "action_statement": reason} if status == "affected" else
                 {"status": "not_affected", "justification": status, "impact_statement": reason})
        return {"vulnerability": {"name": name}, "products": [product], **found}

    return {"@context": "https://openvex.dev/ns/v0.2.0",
            "@id": uuid.uuid5(uuid.NAMESPACE_OID, f"vex {purl(version)}").urn,
            "author": "the maintainers of " + NAME, "timestamp": time, "version": 1,
            "statements": [statement(*weakness) for weakness in weaknesses()]}


def main(version, seconds, folder, jquery=""):
    folder = pathlib.Path(folder)
    time = datetime.datetime.fromtimestamp(int(seconds), datetime.timezone.utc)
    archive, = folder.glob("*.orig.tar.gz")
    sha256 = hashlib.sha256(archive.read_bytes()).hexdigest()
    parts = list(components((folder / "tools.txt").read_text(), jquery))
    for form, make in (("spdx", spdx), ("cdx", cyclonedx), ("openvex", openvex)):
        document = make(version, time.strftime("%Y-%m-%dT%H:%M:%SZ"), sha256, parts)
        (folder / f"{NAME}-{version}.{form}.json").write_text(json.dumps(document, indent=2) + "\n")


main(*sys.argv[1:])
