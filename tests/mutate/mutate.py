#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Breaks the security checks of lib/ one by one, and says which breaks no test notices.

usage: mutate.py BUILD_DIR WORK_DIR [NAME...]

BUILD_DIR is a build tree whose test programs are built. Each source of SOURCES is written anew with all its mutants
(mutants.py), compiled as BUILD_DIR compiles it, and linked before the archives, so that it takes the original's place: one
build for all mutants. Then all tests run once to learn which test reaches which mutant, and for each mutant of the sources
whose path holds a NAME, or of all, those that do run until one fails.

A mutant that survives is printed, and must stand in known.txt with a reason; otherwise the result is a failure.

WORK_DIR keeps what was found out, so that a run which is broken off goes on where it was: hits.tsv, which test reached what;
judged.tsv, every verdict and the test that gave it; results.tsv, what became of the mutants of the last run. All of it counts
for the same programs only. With others, as they are after a change, the test that noticed a mutant is tried first.
"""

import fnmatch
import hashlib
import json
import os
import re
import shlex
import signal
import subprocess
import sys
from collections import Counter, defaultdict
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass
from pathlib import Path
from threading import Lock

from mutants import mutate

ROOT = Path(__file__).resolve().parents[2]
HERE = Path(__file__).resolve().parent
PROGRAMS = ["pelmar_tests", "quorlin_tests", "provider_tests"]
# What these ask is whether everything of a kind (bytes of an exchange broken, bytes of a token altered) ends with the right
# token or an exception, and they take a minute and more: what the precise tests do not notice of a check they should not be
# left to notice.
LEFT_OUT = "*FaultSweep*:*HostFaults*:*TokenMutation*"
# Linked into each of them.
OURS = ["hits", "rsaKeys"]
# Where a token, a chain, a peer, a key or an answer is judged, what is remembered of such a judgement, and what it rests on:
# the canonical form, the limits of reading.
SOURCES = """
lib/quorlin/TokenValidation.cpp lib/quorlin/SamlTokenImpl.cpp lib/quorlin/AssertionParser.cpp lib/quorlin/xmlReading.cpp
lib/quorlin/ResponseHandlerImpl.cpp lib/quorlin/HttpsClient.cpp lib/quorlin/RequestBuilderImpl.cpp
lib/quorlin/GssNegotiationContextImpl.cpp
lib/quorlin-provider/TokenCache.cpp lib/quorlin-provider/Timing.cpp
lib/pelmar/xml/SignatureVerifier.cpp lib/pelmar/xml/SignatureReferenceTarget.cpp lib/pelmar/xml/SignatureReferenceDigest.cpp
lib/pelmar/xml/SignatureReferenceImpl.cpp lib/pelmar/xml/SignatureProfile.cpp lib/pelmar/xml/SignatureSyntax.cpp
lib/pelmar/xml/SignatureChildren.cpp lib/pelmar/xml/SignatureMaker.cpp lib/pelmar/xml/KeyInfoCertificates.cpp
lib/pelmar/xml/TrustChainKeyResolver.cpp lib/pelmar/xml/NamespaceChecker.cpp lib/pelmar/xml/ExpatSession.cpp
lib/pelmar/xml/CanonicalWalk.cpp lib/pelmar/xml/Canonicalizer.cpp lib/pelmar/xml/Parser.cpp
lib/pelmar/crypto/CertificateChain.cpp lib/pelmar/crypto/SignatureValue.cpp lib/pelmar/crypto/KeyStrength.cpp
lib/pelmar/crypto/VerifiedChainCache.cpp lib/pelmar/crypto/EcdsaValue.cpp lib/pelmar/crypto/X509Fields.cpp
lib/pelmar/crypto/CertificateImpl.cpp lib/pelmar/crypto/CertificateCache.cpp lib/pelmar/crypto/KeyContexts.cpp
lib/pelmar/crypto/CertificatePem.cpp lib/pelmar/crypto/PrivateKeyImpl.cpp lib/pelmar/crypto/PrivateKeyInput.cpp
lib/pelmar/crypto/FunctionKey.cpp lib/pelmar/crypto/Pkcs12.cpp lib/pelmar/crypto/Pkcs12Profile.cpp
lib/pelmar/crypto/DigestWriter.cpp
lib/pelmar/ssl/SSLContextImpl.cpp lib/pelmar/ssl/TrustAnchors.cpp
lib/pelmar/http/TlsRecord.cpp lib/pelmar/http/PublicKeyPins.cpp lib/pelmar/http/Transfer.cpp
lib/pelmar/http/ConnectionSpecImpl.cpp lib/pelmar/http/ResponseHead.cpp lib/pelmar/http/CookieStoreImpl.cpp
""".split()
# A mutant that loops or waits for ever has been noticed: a run takes this long, and this many times what its tests took, on a
# machine that may be busy.
SECONDS_PER_RUN = 20
TIMES_PER_RUN = 10
FIRST_TESTS = 25
# One more than can work at a time, as many tests wait for something.
RUNS_AT_ONCE = (os.cpu_count() or 1) + 1
# Each source has so many numbers for its mutants, so that one source's text does not change with another's.
NUMBERS_PER_SOURCE = 250
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
    last changed, and returns what went wrong; warnings are the original's affair."""
    headers = max(path.stat().st_mtime for path in (ROOT / "lib").rglob("*.h"))
    if target.exists() and target.stat().st_mtime > max(source.stat().st_mtime, headers):
        return None
    words = shlex.split(entry["command"])
    at = words.index("-o")
    words[at + 1] = str(target)
    words[words.index("-c") + 1] = str(source)
    words.remove("-Werror")
    done = subprocess.run(words + ["-w", "-O1"], cwd=entry["directory"], stderr=subprocess.PIPE, text=True)
    return f"{source} does not compile:\n{done.stderr[:2000]}" if done.returncode != 0 else None


def write_mutants(work):
    mutants = []
    for index, source in enumerate(SOURCES):
        text, found = mutate(source, (ROOT / source).read_text(encoding="utf-8"), index * NUMBERS_PER_SOURCE)
        if len(found) > NUMBERS_PER_SOURCE:
            sys.exit(f"mutate.py: {source} has {len(found)} mutants, more than NUMBERS_PER_SOURCE")
        path = work / "source" / source
        path.parent.mkdir(parents=True, exist_ok=True)
        if not path.exists() or path.read_text(encoding="utf-8") != text:
            path.write_text(text, encoding="utf-8")
        mutants += found
    return mutants


def link_words(build, program):
    link = run(["ninja", "-t", "commands", program], cwd=build, stdout=subprocess.PIPE, text=True).stdout.splitlines()[-1]
    return shlex.split(link.split(" && cd ")[0].strip().removeprefix(": && ").removesuffix(" && :"))


def build_programs(build, work):
    """Returns a digest of all that the programs are made of."""
    commands = compile_commands(build)
    (work / "objects").mkdir(parents=True, exist_ok=True)
    test = commands[str(ROOT / "tests/support/TokenFactory.cpp")]
    jobs = [(commands[str(ROOT / source)], work / "source" / source, object_of(work, source)) for source in SOURCES]
    jobs += [(test, HERE / f"{ours}.cpp", object_of(work, ours)) for ours in OURS]
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        faults = [fault for fault in pool.map(lambda job: compile_as(*job, work), jobs) if fault]
    if faults:
        sys.exit("mutate.py: " + "\n".join(faults))
    inputs = [path for path in (ROOT / "tests/vectors").rglob("*") if path.is_file()]
    for program in PROGRAMS:
        words = link_words(build, program)
        has_provider = any("quorlin_provider" in word for word in words)
        sources = [source for source in SOURCES if has_provider or "quorlin-provider/" not in source]
        objects = [object_of(work, source) for source in [*sources, *OURS]]
        inputs += objects + [build / word for word in words if word.endswith((".o", ".a"))]
        target = work / program
        words[words.index("-o") + 1] = str(target)
        first = next(i for i, word in enumerate(words) if word.endswith(".a"))
        if not target.exists() or target.stat().st_mtime <= max(path.stat().st_mtime for path in inputs):
            run(words[:first] + [str(path) for path in objects] + words[first:], cwd=build)
    return digest_of(inputs)


def digest_of(paths):
    digest = hashlib.sha256()
    for path in sorted({path.resolve() for path in paths}):
        digest.update(hashlib.sha256(path.read_bytes()).digest())
    return digest.hexdigest()[:16]


# --- Running ---

@dataclass(order=True, frozen=True)
class Test:
    milliseconds: int
    program: str
    name: str


def environment(work, **settings):
    return os.environ | {"QUORLIN_MUTANT_KEYS": str(work / "keys")} | {name: str(value) for name, value in settings.items()}


def learn_from(work, program):
    file = work / f"{program}.hits"
    for old in (file, file.with_name(file.name + ".map")):
        old.unlink(missing_ok=True)
    done = subprocess.run([work / program, "--gtest_brief=1", f"--gtest_filter=-{LEFT_OUT}"], cwd=work,
                          env=environment(work, QUORLIN_MUTANT_HITS=file), stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                          text=True, errors="replace")
    if done.returncode != 0:
        sys.exit(f"mutate.py: {program} fails without a mutant:\n{done.stdout[-4000:]}")
    return [f"{program}\t{line}" for line in file.read_text(encoding="utf-8").splitlines()]


def learn(work, digest):
    """For each mutant the tests that reach it, the quickest first."""
    file = work / "hits.tsv"
    lines = file.read_text(encoding="utf-8").splitlines() if file.exists() else []
    if lines[:1] != [digest]:
        with ThreadPoolExecutor(os.cpu_count()) as pool:
            lines = [digest] + [line for found in pool.map(lambda program: learn_from(work, program), PROGRAMS) for line in found]
        file.write_text("\n".join(lines) + "\n", encoding="utf-8")
    reached = defaultdict(list)
    for line in lines[1:]:
        program, name, milliseconds, numbers = line.split("\t")
        if any(fnmatch.fnmatchcase(name, pattern) for pattern in LEFT_OUT.split(":")):
            continue
        for number in numbers.split():
            reached[int(number)].append(Test(int(milliseconds), program, name))
    for tests in reached.values():
        tests.sort()
    return reached


class Order:
    """In which order to try the tests: those first that have noticed most mutants of the same source, the quick before the
    slow."""

    def __init__(self):
        self.counts, self.lock = defaultdict(Counter), Lock()

    def note(self, source, program, test):
        with self.lock:
            self.counts[source][program, test] += 1

    def batches(self, source, tests, killer):
        with self.lock:
            counts = Counter(self.counts[source])
        by_name = {(test.program, test.name): test for test in tests}
        best = [by_name[name] for name, _ in counts.most_common() if name in by_name][:FIRST_TESTS]
        first = [by_name[killer]] if killer in by_name else []
        tried = set()
        for part in (first, best, tests[:FIRST_TESTS], tests):
            yield from split_by_program([test for test in part if test not in tried])
            tried.update(part)


def split_by_program(tests):
    for program in PROGRAMS:
        batch, size = [], 0
        for test in tests:
            if test.program != program:
                continue
            batch.append(test)
            size += len(test.name) + 1
            if size > MAX_FILTER_BYTES:
                yield program, batch
                batch, size = [], 0
        if batch:
            yield program, batch


# The test programs that run, each with a process group of its own.
running = set()


def stop(*_):
    for process in list(running):
        os.killpg(process.pid, signal.SIGKILL)
    os._exit(1)


def run_tests(work, mutant, program, tests):
    """None when all pass, otherwise how the run ended and in which test."""
    names = ":".join(test.name for test in tests)
    process = subprocess.Popen([str(work / program), "--gtest_fail_fast", "--gtest_color=no", f"--gtest_filter={names}"],
                               cwd=work, env=environment(work, QUORLIN_MUTANT=mutant.number), start_new_session=True,
                               stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True, errors="replace")
    running.add(process)
    limit = SECONDS_PER_RUN + TIMES_PER_RUN * sum(test.milliseconds for test in tests) / 1000
    verdict = "noticed"
    try:
        output, _ = process.communicate(timeout=limit)
    except subprocess.TimeoutExpired:
        verdict = "timed out"
        os.killpg(process.pid, signal.SIGKILL)  # The processes of death tests too.
        output, _ = process.communicate()
    running.discard(process)
    if verdict == "noticed" and process.returncode == 0:
        return None
    begun = re.findall(r"^\[ RUN      \] (\S+)$", output, re.M)
    return verdict, begun[-1] if begun else tests[0].name


def read_known():
    known = {}
    for line in (HERE / "known.txt").read_text(encoding="utf-8").splitlines():
        if line and not line.startswith("#"):
            key, reason = line.rsplit(" # ", 1)
            known[key.strip().replace("[", "[[]").replace("?", "[?]")] = reason
    return known


@dataclass
class Verdict:
    result: str
    program: str = ""
    test: str = ""


class Journal:
    """The verdicts so far; each is kept as soon as it is known."""

    def __init__(self, path, digest):
        self.path, self.digest, self.lock = path, digest, Lock()
        self.known, self.killers = {}, {}
        for line in path.read_text(encoding="utf-8").splitlines() if path.exists() else []:
            digest_then, name, result, program, test = line.split("\t")
            if digest_then == digest:
                self.known[name] = Verdict(result, program, test)
            if test:
                self.killers[name] = (program, test)

    def add(self, name, verdict):
        with self.lock, open(self.path, "a", encoding="utf-8") as file:
            file.write("\t".join((self.digest, name, verdict.result, verdict.program, verdict.test)) + "\n")


def judge_one(work, mutant, tests, order, killer):
    for program, batch in order.batches(mutant.path, tests, killer):
        if found := run_tests(work, mutant, program, batch):
            order.note(mutant.path, program, found[1])
            return Verdict(found[0], program, found[1])
    return Verdict("survived" if tests else "not reached")


def number_keys(mutants):
    """A name for each mutant that another text elsewhere does not change; the like of it are counted."""
    counts, names = defaultdict(int), {}
    for mutant in mutants:
        counts[mutant.key()] += 1
        names[mutant.number] = f"{mutant.key()} | {counts[mutant.key()]}"
    return names


def judge(work, mutants, names, reached, digest):
    journal, order = Journal(work / "judged.tsv", digest), Order()
    for name, killer in journal.killers.items():
        order.note(name.split(" | ")[0], *killer)

    def one(mutant):
        name = names[mutant.number]
        verdict = journal.known.get(name)
        if verdict is None:
            verdict = judge_one(work, mutant, reached.get(mutant.number, []), order, journal.killers.get(name))
            journal.add(name, verdict)
        return verdict

    results = {}
    with ThreadPoolExecutor(RUNS_AT_ONCE) as pool:
        for mutant, verdict in zip(mutants, pool.map(one, mutants)):
            results[mutant.number] = verdict.result
            if verdict.result != "noticed":
                print(f"{verdict.result}: {mutant.path}:{mutant.line}: {mutant.kind}: {mutant.text} {verdict.test}", flush=True)
    with open(work / "results.tsv", "w", encoding="utf-8") as file:
        for mutant in mutants:
            file.write(f"{results[mutant.number]}\t{mutant.path}:{mutant.line}\t{mutant.kind}\t{mutant.text}\n")
    return results


def main(arguments):
    build, work, wanted = Path(arguments[0]).resolve(), Path(arguments[1]).resolve(), arguments[2:]
    for number in (signal.SIGINT, signal.SIGTERM):
        signal.signal(number, stop)
    (work / "keys").mkdir(parents=True, exist_ok=True)
    everything = write_mutants(work)
    mutants = [mutant for mutant in everything if not wanted or any(name in mutant.path for name in wanted)]
    print(f"{len(mutants)} mutants in {len({mutant.path for mutant in mutants})} sources", flush=True)
    digest = build_programs(build, work)
    results = judge(work, mutants, number_keys(everything), learn(work, digest), digest)
    known = read_known()

    def is_known(mutant):
        return any(fnmatch.fnmatchcase(mutant.key(), pattern) for pattern in known)

    left = [mutant for mutant in mutants if results[mutant.number] in ("survived", "not reached")]
    unknown = [mutant for mutant in left if not is_known(mutant)]
    print(f"{len(mutants) - len(left)} of {len(mutants)} mutants noticed, {len(left) - len(unknown)} known to be no matter, "
          f"{len(unknown)} unexplained")
    for mutant in unknown:
        print(f"  {mutant.key()}")
    if not wanted:
        for pattern in known:
            if not any(fnmatch.fnmatchcase(mutant.key(), pattern) for mutant in left):
                print(f"known.txt explains what has not survived: {pattern}")
    return 1 if unknown else 0


if __name__ == "__main__":
    if len(sys.argv) < 3:
        sys.exit("usage: mutate.py BUILD_DIR WORK_DIR [NAME...]")
    sys.exit(main(sys.argv[1:]))
