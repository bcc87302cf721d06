#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Breaks the security checks of lib/ one by one, and says which breaks no test notices.

usage: mutate.py BUILD_DIR WORK_DIR [NAME...]

BUILD_DIR is a build tree whose test programs are built. Each source of SOURCES, or those whose path holds a NAME, is written
anew with all its mutants (mutants.py), compiled as BUILD_DIR compiles it, and linked before the archives, so that it takes
the original's place: one build for all mutants. Then all tests run once to learn which test reaches which mutant, and for
each mutant those that do run until one fails.

A mutant that survives is printed, and must stand in known.txt with a reason; otherwise the result is a failure. WORK_DIR
keeps results.tsv: every mutant and what became of it.
"""

import fnmatch
import json
import os
import re
import shlex
import subprocess
import sys
from collections import defaultdict
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

from mutants import mutate

ROOT = Path(__file__).resolve().parents[2]
HERE = Path(__file__).resolve().parent
PROGRAMS = ["quorlin_tests", "pelmar_tests"]
# Where a token, a chain, a peer or an answer is judged.
SOURCES = """
lib/quorlin/TokenValidation.cpp lib/quorlin/SamlTokenImpl.cpp lib/quorlin/AssertionParser.cpp lib/quorlin/xmlReading.cpp
lib/quorlin/ResponseHandlerImpl.cpp lib/quorlin/HttpsClient.cpp lib/quorlin/RequestBuilderImpl.cpp
lib/quorlin/GssNegotiationContextImpl.cpp
lib/pelmar/xml/SignatureVerifier.cpp lib/pelmar/xml/SignatureReferenceTarget.cpp lib/pelmar/xml/SignatureReferenceDigest.cpp
lib/pelmar/xml/SignatureReferenceImpl.cpp lib/pelmar/xml/SignatureProfile.cpp lib/pelmar/xml/SignatureSyntax.cpp
lib/pelmar/xml/SignatureChildren.cpp lib/pelmar/xml/SignatureMaker.cpp lib/pelmar/xml/KeyInfoCertificates.cpp
lib/pelmar/xml/TrustChainKeyResolver.cpp lib/pelmar/xml/NamespaceChecker.cpp lib/pelmar/xml/ExpatSession.cpp
lib/pelmar/crypto/CertificateChain.cpp lib/pelmar/crypto/SignatureValue.cpp lib/pelmar/crypto/KeyStrength.cpp
lib/pelmar/crypto/VerifiedChainCache.cpp lib/pelmar/crypto/EcdsaValue.cpp lib/pelmar/crypto/X509Fields.cpp
lib/pelmar/crypto/CertificateImpl.cpp
lib/pelmar/ssl/SSLContextImpl.cpp lib/pelmar/ssl/TrustAnchors.cpp
lib/pelmar/http/TlsRecord.cpp lib/pelmar/http/PublicKeyPins.cpp lib/pelmar/http/Transfer.cpp
lib/pelmar/http/ConnectionSpecImpl.cpp lib/pelmar/http/ResponseHead.cpp
""".split()
# A mutant that loops or waits for ever has been noticed.
SECONDS_PER_RUN = 120
FIRST_TESTS = 25
MAX_FILTER_BYTES = 100_000


def run(command, **options):
    return subprocess.run(command, check=True, **options)


# --- Building ---

def compile_commands(build):
    with open(build / "compile_commands.json", encoding="utf-8") as file:
        return {str(Path(entry["file"]).resolve()): entry for entry in json.load(file)}


def object_of(work, source):
    return work / "objects" / (source.replace("/", "_") + ".o")


def compile_as(entry, source, target, work):
    """Compiles `source` with the command that compiles `entry`'s file, unless that was done after all headers were
    last changed; warnings are the original's affair."""
    headers = max(path.stat().st_mtime for path in (ROOT / "lib").rglob("*.h"))
    if target.exists() and target.stat().st_mtime > max(source.stat().st_mtime, headers):
        return
    words = shlex.split(entry["command"])
    at = words.index("-o")
    words[at + 1] = str(target)
    words[words.index("-c") + 1] = str(source)
    words.remove("-Werror")
    done = subprocess.run(words + ["-w", "-O1"], cwd=entry["directory"], stderr=subprocess.PIPE, text=True)
    if done.returncode != 0:
        sys.exit(f"mutate.py: {source} does not compile:\n{done.stderr[:4000]}")


def write_mutants(work, names):
    mutants = []
    for source in SOURCES:
        if names and not any(name in source for name in names):
            continue
        text, found = mutate(source, (ROOT / source).read_text(encoding="utf-8"), len(mutants))
        path = work / "source" / source
        path.parent.mkdir(parents=True, exist_ok=True)
        if not path.exists() or path.read_text(encoding="utf-8") != text:
            path.write_text(text, encoding="utf-8")
        mutants += found
    return mutants


def build_programs(build, work, mutants):
    commands = compile_commands(build)
    (work / "objects").mkdir(parents=True, exist_ok=True)
    sources = sorted({mutant.path for mutant in mutants})
    hits = commands[str(ROOT / "tests/support/TokenFactory.cpp")]
    jobs = [(commands[str(ROOT / source)], work / "source" / source, object_of(work, source)) for source in sources]
    jobs.append((hits, HERE / "hits.cpp", object_of(work, "hits")))
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        list(pool.map(lambda job: compile_as(*job, work), jobs))
    for program in PROGRAMS:
        link = run(["ninja", "-t", "commands", f"tests/{program}"], cwd=build, stdout=subprocess.PIPE,
                   text=True).stdout.splitlines()[-1]
        link = re.sub(r"^: && | && :$", "", link.split(" && cd ")[0].strip())
        words = shlex.split(link.removeprefix(": && ").removesuffix(" && :"))
        words[words.index("-o") + 1] = str(work / program)
        first = next(i for i, word in enumerate(words) if word.endswith(".a"))
        objects = [str(object_of(work, source)) for source in [*sources, "hits"]]
        run(words[:first] + objects + words[first:], cwd=build)


# --- Running ---

def learn(work):
    """For each mutant the tests that reach it, as (milliseconds, program, name), the quickest first."""
    reached = defaultdict(list)
    for program in PROGRAMS:
        file = work / f"{program}.hits"
        for old in (file, file.with_name(file.name + ".map")):
            old.unlink(missing_ok=True)
        done = subprocess.run([work / program, "--gtest_brief=1"], cwd=work, env=os.environ | {"QUORLIN_MUTANT_HITS": str(file)},
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, errors="replace")
        if done.returncode != 0:
            sys.exit(f"mutate.py: {program} fails without a mutant:\n{done.stdout[-4000:]}")
        for line in file.read_text(encoding="utf-8").splitlines():
            name, milliseconds, numbers = line.split("\t")
            for number in numbers.split():
                reached[int(number)].append((int(milliseconds), program, name))
    for tests in reached.values():
        tests.sort()
    return reached


def batches(tests):
    """The tests in the order to be tried: some quick ones first, then the rest, by program."""
    for part in (tests[:FIRST_TESTS], tests[FIRST_TESTS:]):
        for program in PROGRAMS:
            names, size = [], 0
            for _, where, name in part:
                if where != program:
                    continue
                names.append(name)
                size += len(name) + 1
                if size > MAX_FILTER_BYTES:
                    yield program, names
                    names, size = [], 0
            if names:
                yield program, names


def is_noticed(work, mutant, tests):
    for program, names in batches(tests):
        command = [str(work / program), "--gtest_brief=1", "--gtest_fail_fast", "--gtest_filter=" + ":".join(names)]
        try:
            done = subprocess.run(command, cwd=work, env=os.environ | {"QUORLIN_MUTANT": str(mutant.number)},
                                  stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, timeout=SECONDS_PER_RUN)
        except subprocess.TimeoutExpired:
            return True
        if done.returncode != 0:
            return True
    return False


def read_known():
    known = {}
    for line in (HERE / "known.txt").read_text(encoding="utf-8").splitlines():
        if line and not line.startswith("#"):
            key, reason = line.rsplit(" # ", 1)
            known[key.strip().replace("[", "[[]")] = reason
    return known


def judge(work, mutants, reached):
    def one(mutant):
        tests = reached.get(mutant.number, [])
        return "noticed" if tests and is_noticed(work, mutant, tests) else "survived" if tests else "not reached"

    results = {}
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        for mutant, result in zip(mutants, pool.map(one, mutants)):
            results[mutant.number] = result
            if result != "noticed":
                print(f"{result}: {mutant.path}:{mutant.line}: {mutant.kind}: {mutant.text}", flush=True)
    with open(work / "results.tsv", "w", encoding="utf-8") as file:
        for mutant in mutants:
            file.write(f"{results[mutant.number]}\t{mutant.path}:{mutant.line}\t{mutant.kind}\t{mutant.text}\n")
    return results


def main(arguments):
    build, work = Path(arguments[0]).resolve(), Path(arguments[1]).resolve()
    work.mkdir(parents=True, exist_ok=True)
    mutants = write_mutants(work, arguments[2:])
    print(f"{len(mutants)} mutants in {len({mutant.path for mutant in mutants})} sources", flush=True)
    build_programs(build, work, mutants)
    results = judge(work, mutants, learn(work))
    known = read_known()

    def is_known(mutant):
        return any(fnmatch.fnmatchcase(mutant.key(), pattern) for pattern in known)

    left = [mutant for mutant in mutants if results[mutant.number] != "noticed"]
    unknown = [mutant for mutant in left if not is_known(mutant)]
    print(f"{len(mutants) - len(left)} of {len(mutants)} mutants noticed, {len(left) - len(unknown)} known to be no matter, "
          f"{len(unknown)} unexplained")
    for mutant in unknown:
        print(f"  {mutant.key()}")
    return 1 if unknown else 0


if __name__ == "__main__":
    if len(sys.argv) < 3:
        sys.exit("usage: mutate.py BUILD_DIR WORK_DIR [NAME...]")
    sys.exit(main(sys.argv[1:]))
