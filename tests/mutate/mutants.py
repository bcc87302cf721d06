# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Writes a source anew with mutants in it, each of which an environment variable switches on.

The sources are read as text, in the shape that clang-format gives them; what is not understood is left as it is. Mutants:

  never, always    the condition of an if, a ternary or a boolean return does not hold, or holds
  skip             one side of && or || does not count
  boundary         < for <=, > for >=, and the other way round
  drop             a statement (a call, an assignment) is left out
  loop             a while does not begin
  zero, one        a function of int returns that

Not mutated: what only happens when OpenSSL or curl has no memory. Of the condition that finds it out, which often makes the
call, `never` and `skip` are tried where there is one: then the call is not made.
"""

import re
from dataclasses import dataclass

PROLOGUE = "extern \"C\" bool QuorlinIsMutant(int number) noexcept;\n"

KEYWORDS = {"return", "throw", "if", "for", "while", "do", "switch", "case", "break", "continue", "else", "try", "catch",
            "using", "typedef", "static", "const", "constexpr", "goto", "struct", "class", "enum", "namespace", "template",
            "default", "thread_local", "public", "private", "protected", "extern", "inline", "friend", "delete", "auto", "static_assert"}
TYPES = {"unsigned", "long", "int", "char", "bool", "double"}
DECLARATION = re.compile(r"^[\w:]+(<[^;]*?>)?(::\w+)?[\s*&]+(const\s+)?\w+\s*[=;({\[]")
CODE_BRACE = re.compile(r"(\)|\bconst|\bnoexcept|\boverride|\bfinal|\belse|\btry|\bdo|\bmutable|\]|->\s*[\w:<>&* ]+)$")


BREAKDOWN = re.compile(r"(Crypto::|Pelmar::)?(ThrowOpenSslError|PanicNotReached|VerifyFailed)\(|throw std::bad_alloc"
                       r"|throw HttpException\((std::string\()?\"The HTTP (engine|client)")


@dataclass
class Mutant:
    number: int
    path: str
    line: int
    kind: str
    text: str

    def key(self):
        """What a list of known survivors names it by: the line may move, the text does not."""
        return f"{self.path} | {self.kind} | {self.text}"


def mask(source):
    """The same text with comments, literals and preprocessor lines blanked, every offset kept."""
    out = list(source)
    pattern = re.compile(r'//[^\n]*|/\*.*?\*/|"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])+\'|^[ \t]*#[^\n]*(?:\\\n[^\n]*)*', re.S | re.M)
    for match in pattern.finditer(source):
        for i in range(match.start(), match.end()):
            if out[i] != "\n":
                out[i] = "_" if source[match.start()] in "\"'" else " "
    return "".join(out)


def closing(text, at):
    """The offset of the bracket that closes the one at `at`."""
    depth = 0
    for i in range(at, len(text)):
        if text[i] in "([{":
            depth += 1
        elif text[i] in ")]}":
            depth -= 1
            if depth == 0:
                return i
    raise ValueError("a bracket is not closed")


class Writer:
    def __init__(self, path, source, first):
        self.path = path
        self.source = source
        self.text = mask(source)
        self.next = first
        self.mutants = []
        self.insertions = []  # (offset, order, text): at one offset what ends comes before what begins.

    def add(self, at, kind, text):
        number = self.next
        self.next += 1
        line = self.source.count("\n", 0, at) + 1
        self.mutants.append(Mutant(number, self.path, line, kind, " ".join(text.split())))
        return number

    def around(self, begin, end, before, after):
        """Inserts around a span. Of spans that begin together the longer one is outside."""
        self.insertions.append((begin, 1, -end, before))
        self.insertions.append((end, 0, -begin, after))

    def result(self):
        parts, at = [PROLOGUE, f'#line 1 "{self.path}"\n'], 0
        for offset, _, _, text in sorted(self.insertions, key=lambda one: one[:3]):
            parts += [self.source[at:offset], text]
            at = offset
        return "".join(parts + [self.source[at:]])

    # --- Conditions ---

    def trim(self, begin, end):
        while begin < end and self.text[begin].isspace():
            begin += 1
        while end > begin and self.text[end - 1].isspace():
            end -= 1
        return begin, end

    def split(self, begin, end, operators):
        """The spans between top-level operators; angle brackets are not brackets here."""
        spans, depth, start, i = [], 0, begin, begin
        while i < end:
            if self.text[i] in "([{":
                depth += 1
            elif self.text[i] in ")]}":
                depth -= 1
            elif depth == 0 and self.text[i:i + 2] in operators:
                spans.append((start, i))
                i += 2
                start = i
                continue
            i += 1
        return spans + [(start, end)]

    def find_top(self, begin, end, pattern):
        depth = 0
        for i in range(begin, end):
            if self.text[i] in "([{":
                depth += 1
            elif self.text[i] in ")]}":
                depth -= 1
            elif depth == 0:
                match = re.compile(pattern).match(self.text, i, end)
                if match:
                    return match
        return None

    def condition(self, begin, end, calls_only=False):
        """The mutants of a boolean expression, or only those by which a call in it is not made."""
        begin, end = self.trim(begin, end)
        text = self.source[begin:end]
        if not text or "?" in self.text[begin:end] and self.find_top(begin, end, r"\?"):
            return
        start = "("
        if text != "false":
            start += f"QuorlinIsMutant({self.add(begin, 'never', text)}) ? false : "
        if text != "true" and not calls_only:
            start += f"QuorlinIsMutant({self.add(begin, 'always', text)}) ? true : "
        self.around(begin, end, start + "static_cast<bool>(", "))")
        self.operands(begin, end, calls_only)

    def operands(self, begin, end, calls_only=False):
        for operators, neutral in ((("||",), "false"), (("&&",), "true")):
            spans = self.split(begin, end, operators)
            if len(spans) > 1:
                for span in spans:
                    low, high = self.trim(*span)
                    if calls_only and "(" not in self.text[low:high]:
                        continue
                    number = self.add(low, "skip", self.source[low:high])
                    self.around(low, high, f"(QuorlinIsMutant({number}) ? {neutral} : static_cast<bool>(", "))")
                    self.operands(low, high, calls_only)
                return
        if not calls_only:
            self.boundary(begin, end)

    def boundary(self, begin, end):
        match = self.find_top(begin, end, r" (<=|>=|<|>) ")
        if not match:
            return
        # Written with the same operator, which may be the only one that there is: a <= b is !(b < a).
        left, right = self.source[begin:match.start()], self.source[match.end():end]
        changed = f"!(({right}) {match.group(1)} ({left}))"
        number = self.add(begin, "boundary", self.source[begin:end])
        self.around(begin, end, f"(QuorlinIsMutant({number}) ? ({changed}) : (", "))")

    # --- Statements ---

    def statements(self):
        """Walks the text once, knowing for each brace whether code stands in it."""
        kinds, i, start = ["outer"], 0, 0
        while i < len(self.text):
            c = self.text[i]
            if c in "([":
                i = self.parenthesis(i)
                continue
            if c == "{":
                kinds.append(self.brace_kind(start, i, kinds[-1]))
                if kinds[-1] == "values":
                    kinds.pop()
                    self.inner(i + 1, closing(self.text, i))
                    i = closing(self.text, i) + 1
                    continue
                start = i + 1
            elif c == "}":
                kinds.pop()
                start = i + 1
            elif c == ";":
                if kinds[-1] == "code":
                    self.statement(start, i)
                start = i + 1
            elif c == ":" and kinds[-1] == "code" and re.match(r"\s*(case\b.*|default\s*)$", self.text[start:i], re.S) \
                    and self.text[i + 1] != ":" and self.text[i - 1] != ":":
                start = i + 1
            i += 1

    def parenthesis(self, i):
        """Behind a parenthesis; what stands in it is looked at for conditions and for lambdas."""
        end = closing(self.text, i)
        before = self.text[max(0, i - 12):i].rstrip()
        if re.search(r"\bif$", before):
            self.head(i + 1, end)
        elif re.search(r"\bwhile$", before):
            low, high = self.trim(i + 1, end)
            if not self.find_top(low, high, r" = "):  # A declaration, which nothing can stand around.
                number = self.add(low, "loop", self.source[low:high])
                self.around(low, high, f"(QuorlinIsMutant({number}) ? false : static_cast<bool>(", "))")
                self.operands(low, high)
        self.inner(i + 1, end)
        return end + 1

    def head(self, begin, end):
        text = self.text[begin:end]
        if ";" in text or re.search(r"[^=!<>]=[^=]", text):
            return
        body = re.match(r"\s*\{\s*", self.source[end + 1:])
        if not body or not BREAKDOWN.match(self.source, end + 1 + body.end()):
            self.condition(begin, end)
        elif "(" in text:
            self.condition(begin, end, calls_only=True)

    def inner(self, begin, end):
        """Lambdas within an expression have statements of their own."""
        i = begin
        while i < end:
            if self.text[i] == "{" and re.search(r"(\)|\]|\bmutable|->\s*[\w:]+)\s*$", self.text[begin:i]) \
                    and re.search(r"\[[^\]]*\]\s*(\([^()]*(\([^()]*\))?[^()]*\))?\s*(mutable|->\s*[\w:]+)?\s*$", self.text[begin:i]):
                stop = closing(self.text, i)
                self.block(i + 1, stop)
                i = stop
            i += 1

    def block(self, begin, end):
        start, i = begin, begin
        while i < end:
            c = self.text[i]
            if c in "([":
                i = self.parenthesis(i)
                continue
            if c in "{}":
                start = i + 1
            elif c == ";":
                self.statement(start, i, in_lambda=True)
                start = i + 1
            i += 1

    def brace_kind(self, start, at, around):
        before = self.text[start:at].rstrip()
        if re.search(r"\bnamespace\b[\s\w:]*$", before):
            return "outer"
        if re.match(r"\s*(template\s*<.*>\s*)?(class|struct|enum|union)\b", before) and not before.endswith(")"):
            return "outer"
        if before.endswith((":",)) or before == "" or CODE_BRACE.search(before):
            return "code" if around != "outer" or CODE_BRACE.search(before) else "outer"
        return "values"

    def function_type(self, at):
        """The last word of the type of the innermost named function around."""
        heads = re.findall(r"^(?:  )?(?:static |inline |virtual )?([\w:<>*& ]+?)\s[\w:~]+\(", self.text[:at], re.M)
        for head in reversed(heads):
            words = head.split()
            if words and words[0] not in KEYWORDS | {"return", "else"} or words[:1] == ["const"]:
                return words[-1]
        return ""

    def statement(self, start, end, in_lambda=False):
        begin, end = self.trim(start, end)
        text = self.text[begin:end]
        word = re.match(r"\w*", text).group(0)
        if word == "return":
            low, high = self.trim(begin + 6, end)
            self.returned(low, high, in_lambda)
            return
        self.ternaries(begin, end)
        if word == "continue":
            pass
        elif word in KEYWORDS | TYPES or not text or DECLARATION.match(text.replace("STACK_OF(X509)", "X509s") + ";"):
            return
        elif not ("(" in text or "=" in text or "++" in text or "--" in text):
            return
        if BREAKDOWN.match(self.source, begin):
            return
        number = self.add(begin, "drop", self.source[begin:end])
        self.around(begin, end + 1, f"if (!QuorlinIsMutant({number})) {{ ", " }")

    def returned(self, begin, end, in_lambda):
        text = self.text[begin:end]
        if not text:
            return
        top = re.search(r"==|!=|&&|\|\||^!|\b(any_of|all_of|none_of)\(", text) or self.find_top(begin, end, r" (<=|>=|<|>) ")
        kind = self.function_type(begin)
        boolean = in_lambda and top or not in_lambda and kind == "bool"
        if not in_lambda and kind == "int":
            zero, one = self.add(begin, "zero", text), self.add(begin, "one", text)
            self.around(begin, end, f"(QuorlinIsMutant({zero}) ? 0 : QuorlinIsMutant({one}) ? 1 : (", "))")
        elif boolean and not self.find_top(begin, end, r"\?"):
            self.condition(begin, end)
        else:
            self.ternaries(begin, end)

    def ternaries(self, begin, end):
        """The condition of a ternary that begins the expression, or follows what is assigned or returned."""
        question = self.find_top(begin, end, r" \? ")
        if not question:
            return
        equals = self.find_top(begin, question.start(), r" (=|\+=) ")
        low = equals.end() if equals else begin
        low, high = self.trim(low, question.start())
        if high > low and "=" not in re.sub(r"[=!<>]=", "", self.text[low:high]):
            self.condition(low, high)


def mutate(path, source, first):
    """The source with mutants numbered from `first`, and the list of them."""
    writer = Writer(path, source, first)
    writer.statements()
    return writer.result(), writer.mutants
