#!/usr/bin/env python3
"""Seeds small faults into the product code, one at a time, and names those the tests miss.

A mutant is one edit of code, never of a comment or a string: a flipped comparison, an off-by-one,
a changed constant, a negated condition, a dropped statement, swapped operands or a replaced
operator. Each is built incrementally and tested, and its file is put back, also after Ctrl-C.
The same seed, tree and options pick the same mutants; a larger --count keeps a smaller one's.

  scripts/mutate.py --list --count 20 --files 'writer/*'     the mutants a run would try
  nice scripts/mutate.py --count 20 --files 'writer/*' --ctest-args '-R Writer'
"""
import argparse, bisect, fnmatch, hashlib, json, os, random, re, shlex, shutil, signal
import subprocess, sys, time
from collections import namedtuple
from contextlib import contextmanager
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
DEFAULT_PATHS = 'converter,reader,builder,writer,tools'
KINDS = ('comparison', 'off-by-one', 'constant', 'negate', 'drop', 'swap', 'operator')

# --- tokens ---------------------------------------------------------------------------------

TOKEN_RE = re.compile(r'''
    (?P<space>\s+)
  | (?P<comment>//[^\n]*|/\*.*?\*/)
  | (?P<pp>\#(?:\\\n|[^\n])*)
  | (?P<string>(?:u8|[uUL])?R"(?P<delim>[^(\s]{0,16})\(.*?\)(?P=delim)"
              |(?:u8|[uUL])?"(?:\\.|[^"\\\n])*"
              |(?:u8|[uUL])?'(?:\\.|[^'\\\n])+')
  | (?P<number>\.?\d(?:[eEpP][+-]|'?[\w.])*)
  | (?P<ident>[A-Za-z_]\w*)
  | (?P<op><=>|<<=|>>=|->\*|\.\.\.|::|->|\+\+|--|<<|>>|<=|>=|==|!=|&&|\|\||[-+*/%&|^]=|.)
''', re.S | re.X)

# kind is 'number', 'ident' or 'op'. spaced means whitespace on both sides, which in this
# formatting tells a binary operator from a unary one, a template bracket or a pointer.
Token = namedtuple('Token', 'kind text start end spaced')


def tokenize(src):
    """Code tokens only: comments, strings, characters and preprocessor lines are skipped."""
    tokens, pos = [], 0
    while pos < len(src):
        m = TOKEN_RE.match(src, pos)
        if m.lastgroup in ('number', 'ident', 'op'):
            spaced = src[m.start() - 1:m.start()].isspace() and src[m.end():m.end() + 1].isspace()
            tokens.append(Token(m.lastgroup, m.group(), m.start(), m.end(), spaced))
        pos = m.end()
    return tokens


# --- mutation sites: (kind, start, end, replacement) ----------------------------------------

FLIP = {'==': '!=', '!=': '==', '<': '>', '>': '<', '<=': '>=', '>=': '<='}
BOUNDARY = {'<': '<=', '<=': '<', '>': '>=', '>=': '>'}
OPERATOR = {'+': '-', '-': '+', '*': '/', '/': '*', '&&': '||', '||': '&&', '&': '|', '|': '&',
            '+=': '-=', '-=': '+='}
PRECEDENCE = {'*': 13, '/': 13, '%': 13, '+': 12, '-': 12, '<<': 11, '>>': 11, '<': 9, '<=': 9,
              '>': 9, '>=': 9, '==': 8, '!=': 8, '&': 7, '^': 6, '|': 5, '&&': 4, '||': 3, '?': 2,
              ':': 2, '=': 1, '+=': 1, '-=': 1, '*=': 1, '/=': 1, '|=': 1, '&=': 1, ',': 0}
SWAPPABLE = {'-', '/', '%', '<', '<=', '>', '>='}
NOT_OPERANDS = {'return', 'sizeof', 'const', 'auto', 'case', 'new', 'delete', 'operator', 'this'}
DECL_WORDS = {'auto', 'const', 'constexpr', 'static', 'unsigned', 'signed', 'struct', 'class',
              'enum', 'union', 'template', 'typename', 'friend', 'using', 'typedef', 'extern',
              'namespace', 'static_assert', 'return', 'case', 'default', 'goto', 'throw', 'new',
              'co_return', 'inline', 'virtual', 'explicit', 'thread_local', 'volatile'}
EFFECTS = {'(', '=', '+=', '-=', '*=', '/=', '|=', '&=', '^=', '<<=', '>>=', '++', '--'}
CODE_BLOCK_AFTER = {')', ']', 'const', 'noexcept', 'override', 'final', 'mutable', 'else', 'do',
                    'try', '{', '}', ';', ':'}


def integer_sites(tok):
    """An integer literal one higher, and a non-zero one as zero, in the literal's own base."""
    m = re.fullmatch(r"(0[xX][0-9a-fA-F']+|0[bB][01']+|0[0-7']*|[1-9][0-9']*)([uUlLzZ]*)", tok.text)
    if not m:
        return
    digits, suffix = m.group(1).replace("'", ''), m.group(2)
    octal = len(digits) > 1 and digits[0] == '0'
    base = {'0x': 16, '0X': 16, '0b': 2, '0B': 2}.get(digits[:2], 8 if octal else 10)
    value = int(digits[2:] if base == 2 else digits, base)
    fmt = {16: digits[:2] + '{:X}', 2: digits[:2] + '{:b}', 8: '0{:o}', 10: '{}'}[base]
    yield 'off-by-one', tok.start, tok.end, fmt.format(value + 1) + suffix
    if value:
        yield 'constant', tok.start, tok.end, fmt.format(0) + suffix


def operator_sites(tokens, i):
    tok = tokens[i]
    if tok.kind == 'number':
        yield from integer_sites(tok)
    if tok.text in ('true', 'false'):
        yield 'constant', tok.start, tok.end, 'false' if tok.text == 'true' else 'true'
    if not tok.spaced:  # unary operators, template brackets, pointers and references
        return
    for kind, table in (('comparison', FLIP), ('off-by-one', BOUNDARY), ('operator', OPERATOR)):
        if tok.text in table:
            yield kind, tok.start, tok.end, table[tok.text]
    if tok.text in SWAPPABLE and 2 <= i < len(tokens) - 2:
        yield from swap_site(tokens[i - 2:i + 3])


def swap_site(window):
    """`a - b` to `b - a` where both operands are single names or numbers bound to the operator:
    what comes before binds less tightly, what comes after no more tightly."""
    before, left, op, right, after = window
    rank = PRECEDENCE[op.text]
    simple = all(t.kind != 'op' and t.text not in NOT_OPERANDS for t in (left, right))
    opens = before.text in ('(', '[', '{', ';', 'return') or (
        before.spaced and PRECEDENCE.get(before.text, 99) < rank)
    closes = after.text in (')', ']', '}', ';') or (after.spaced and PRECEDENCE.get(after.text, 99) <= rank)
    if simple and opens and closes and left.text != right.text:
        yield 'swap', left.start, right.end, f'{right.text} {op.text} {left.text}'


def condition_sites(tokens, i, src):
    """Negates if and while conditions; drops a logical not."""
    if tokens[i].text == '!':
        yield 'negate', tokens[i].start, tokens[i].end, ''
    if tokens[i].text not in ('if', 'while') or i + 1 == len(tokens) or tokens[i + 1].text != '(':
        return
    depth, close = 0, None
    for j in range(i + 1, len(tokens)):
        depth += {'(': 1, ')': -1}.get(tokens[j].text, 0)
        if depth == 0:
            close = j
            break
    inner = tokens[i + 2:close] if close else []
    if inner and not any(t.text == ';' for t in inner) and not is_declaration(inner):
        start, end = tokens[i + 1].end, tokens[close].start
        yield 'negate', start, end, f'!({src[start:end]})'


def is_declaration(stmt):
    """True for statements that begin like `Type name`, `Type* name` or `ns::Type<T> name`."""
    if stmt[0].text in DECL_WORDS:
        return True
    j, n = 0, len(stmt)
    while j < n and stmt[j].kind == 'ident':
        j += 1
        if j < n and stmt[j].text == '<' and not stmt[j].spaced:  # template arguments
            depth = 0
            while j < n:
                depth += {'<': 1, '>': -1, '>>': -2}.get(stmt[j].text, 0)
                j += 1
                if depth <= 0:
                    break
        if j >= n or stmt[j].text != '::':
            break
        j += 1
    while 0 < j < n and stmt[j].text in ('*', '&', '&&', 'const') and not stmt[j].spaced:
        j += 1
    return 0 < j < n and stmt[j].kind == 'ident'


def droppable(stmt):
    if len(stmt) == 2 and stmt[0].text in ('break', 'continue', 'return'):
        return True
    if stmt[0].kind != 'ident' and stmt[0].text not in ('*', '++', '--'):
        return False
    return not is_declaration(stmt) and any(t.text in EFFECTS for t in stmt)


def statement_sites(tokens):
    """Drops whole statements of function bodies: calls, assignments, increments, jumps."""
    blocks, parens, start = [False], [], 0
    for i, tok in enumerate(tokens):
        if tok.text in ('(', '['):
            parens.append(i)
        elif tok.text in (')', ']') and parens:
            opened, head = parens.pop(), tokens[start].text
            if not parens and opened - start in (1, 2) and head in ('if', 'while', 'for', 'switch'):
                start = i + 1  # the statement controlled by the header starts here
        elif parens:
            continue
        elif tok.text == '{':
            blocks.append(blocks[-1] or (i > 0 and tokens[i - 1].text in CODE_BLOCK_AFTER))
            start = i + 1
        elif tok.text == '}':
            if len(blocks) > 1:
                blocks.pop()
            start = i + 1
        elif tok.text == 'else' or (tok.text == ':' and tokens[start].text in (
                'case', 'default', 'public', 'private', 'protected')):
            start = i + 1
        elif tok.text == ';':
            stmt = tokens[start:i + 1]
            if blocks[-1] and len(stmt) > 1 and droppable(stmt):
                yield 'drop', stmt[0].start, tok.end, '{}'
            start = i + 1


def file_sites(src):
    """Every site of a file, in a fixed order, and the file's size in lines of code."""
    tokens = tokenize(src)
    sites = set(statement_sites(tokens))
    for i in range(len(tokens)):
        sites.update(operator_sites(tokens, i))
        sites.update(condition_sites(tokens, i, src))
    newlines = [k for k, c in enumerate(src) if c == '\n']
    code_lines = {bisect.bisect(newlines, t.start) for t in tokens}
    return sorted(sites, key=lambda s: (s[1], s[2], s[0], s[3])), len(code_lines)


# --- choosing -------------------------------------------------------------------------------


class Mutant(namedtuple('Mutant', 'path line col kind start end new old')):
    def describe(self):
        old, new = (' '.join(t.split()) for t in (self.old, self.new))
        old, new = (t if len(t) <= 60 else t[:57] + '...' for t in (old, new))
        return f"{self.path}:{self.line}:{self.col}: {self.kind}: '{old}' -> '{new}'"


def source_files(paths, patterns):
    files = set()
    for folder in paths:
        if not (ROOT / folder).is_dir():
            sys.exit(f'mutate: no folder {folder} in {ROOT}')
        for path in (ROOT / folder).rglob('*'):
            rel = path.relative_to(ROOT).as_posix()
            if path.suffix in ('.cpp', '.h') and (
                    not patterns or any(fnmatch.fnmatch(rel, p) for p in patterns)):
                files.add(rel)
    return sorted(files)


def share_out(count, sizes, capacity):
    """Splits `count` over files in proportion to their size, no file beyond its sites."""
    total = sum(sizes.values()) or 1
    exact = {f: count * s / total for f, s in sizes.items()}
    quota = {f: min(int(x), capacity[f]) for f, x in exact.items()}
    by_remainder = sorted(sizes, key=lambda f: (int(exact[f]) - exact[f], -sizes[f], f))
    while sum(quota.values()) < count:
        spare = [f for f in by_remainder if quota[f] < capacity[f]]
        if not spare:
            break
        for f in spare[:count - sum(quota.values())]:
            quota[f] += 1
    return quota


def choose(files, count, seed, kinds):
    sites, sizes, texts = {}, {}, {}
    for rel in files:
        texts[rel] = (ROOT / rel).read_bytes().decode('utf-8')
        found, sizes[rel] = file_sites(texts[rel])
        sites[rel] = [s for s in found if s[0] in kinds]
    quota = share_out(count, sizes, {f: len(s) for f, s in sites.items()})
    mutants = []
    for rel in files:
        order, src = sites[rel][:], texts[rel]
        random.Random(f'{seed}:{rel}').shuffle(order)  # a file's picks ignore the other files
        for kind, start, end, new in sorted(order[:quota[rel]], key=lambda s: s[1]):
            line, col = src.count('\n', 0, start) + 1, start - src.rfind('\n', 0, start)
            mutants.append(Mutant(rel, line, col, kind, start, end, new, src[start:end]))
    return mutants


# --- running --------------------------------------------------------------------------------


def run(cmd, timeout=None):
    """Runs a command in its own process group, so that a timeout or Ctrl-C ends all of it."""
    proc = subprocess.Popen(cmd, cwd=ROOT, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                            text=True, errors='replace', start_new_session=True)
    try:
        return proc.communicate(timeout=timeout)[0], proc.returncode
    except subprocess.TimeoutExpired:
        kill_group(proc)
        return proc.communicate()[0], None
    except BaseException:
        kill_group(proc)
        proc.wait()
        raise


def kill_group(proc):
    try:
        os.killpg(proc.pid, signal.SIGKILL)
    except ProcessLookupError:  # it ended by itself meanwhile
        pass


def checksum(path):
    return hashlib.sha256(path.read_bytes()).hexdigest()


def on_signal(signum, _frame):
    raise KeyboardInterrupt(signal.Signals(signum).name)


@contextmanager
def blocked_signals():
    """Holds Ctrl-C and kill back while a source file and its journal are written."""
    signals = {signal.SIGINT, signal.SIGTERM, signal.SIGHUP}
    signal.pthread_sigmask(signal.SIG_BLOCK, signals)
    try:
        yield
    finally:
        signal.pthread_sigmask(signal.SIG_UNBLOCK, signals)


class Workspace:
    """The build directory, and a journal there that lets the next run undo a killed one."""

    def __init__(self, build_dir, jobs=0, test_args=()):
        self.build_dir, self.jobs, self.test_args = build_dir, jobs, list(test_args)
        self.journal = build_dir / 'mutate-pending.json'
        self.backup = build_dir / 'mutate-pending.orig'

    def recover(self):
        if not self.journal.exists():
            return
        entry = json.loads(self.journal.read_text())
        target = ROOT / entry['path']
        if not self.backup.exists() or checksum(self.backup) != entry['sha256']:
            sys.exit(f"mutate: {self.journal} names {entry['path']}, whose saved original is "
                     'missing or damaged; check that file, then remove the journal')
        if checksum(target) != entry['sha256']:
            shutil.copyfile(self.backup, target)
            print(f"mutate: restored {entry['path']}, left mutated by an interrupted run")
        self.backup.unlink(missing_ok=True)
        self.journal.unlink()

    def configure(self):
        if (self.build_dir / 'CMakeCache.txt').exists():
            return
        cmd = ['cmake', '-S', str(ROOT), '-B', str(self.build_dir), '-G', 'Ninja',
               '-DVRX_BUILD_BENCH=OFF'] + (
                   ['-DCMAKE_CXX_COMPILER_LAUNCHER=ccache'] if shutil.which('ccache') else [])
        print('configuring:', shlex.join(cmd))
        out, code = run(cmd)
        if code != 0:
            sys.exit(f'mutate: configuring {self.build_dir} failed:\n{out}')

    def build(self):
        jobs = ['--parallel', str(self.jobs)] if self.jobs else []
        return run(['cmake', '--build', str(self.build_dir)] + jobs)

    def test(self, timeout):
        """ctest with `timeout` seconds a test, and twice that for the whole run."""
        jobs = ['--parallel', str(self.jobs)] if self.jobs else []
        return run(['ctest', '--test-dir', str(self.build_dir), '--no-tests=error',
                    '--stop-on-failure', '--timeout', str(int(timeout))] + jobs + self.test_args,
                   timeout * 2)

    def apply(self, mutant, original):
        """Writes the mutant, the original kept where the next run finds it."""
        text = original.decode('utf-8')
        if text[mutant.start:mutant.end] != mutant.old:
            sys.exit(f'mutate: {mutant.path} changed while the run went on')
        with blocked_signals():
            self.backup.write_bytes(original)
            entry = {'path': mutant.path, 'sha256': hashlib.sha256(original).hexdigest()}
            self.journal.write_text(json.dumps(entry))
            mutated = text[:mutant.start] + mutant.new + text[mutant.end:]
            (ROOT / mutant.path).write_bytes(mutated.encode('utf-8'))

    def restore(self, mutant, original, expected):
        with blocked_signals():
            (ROOT / mutant.path).write_bytes(original)
            if checksum(ROOT / mutant.path) != expected:
                sys.exit(f'mutate: {mutant.path} was not restored; the original is {self.backup}')
            self.journal.unlink()
            self.backup.unlink()


def try_mutant(space, mutant, sums, timeout):
    """The outcome ('caught', 'survived' or 'uncompiled') and what decided it."""
    original = (ROOT / mutant.path).read_bytes()
    try:
        space.apply(mutant, original)
        out, code = space.build()
        if code != 0:
            # A test program that crashes while its tests are listed fails the build.
            if 'Error running test executable' in out:
                return 'caught', 'a test program failed to start'
            return 'uncompiled', ''
        out, code = space.test(timeout)
        if code is None:
            return 'caught', f'timed out after {int(timeout * 2)} s'
        if code == 0:
            return 'survived', ''
        failed = re.search(r'tests FAILED:\s*\n\s*\d+ - (.+)', out)
        return 'caught', failed.group(1).strip() if failed else 'ctest failed'
    finally:
        space.restore(mutant, original, sums[mutant.path])


def baseline(space):
    print('building and running the tests without a mutant...', flush=True)
    out, code = space.build()
    if code != 0:
        sys.exit(f'mutate: the tree does not build without a mutant:\n{out[-3000:]}')
    began = time.monotonic()
    out, code = space.test(3600)
    if code != 0:
        sys.exit(f'mutate: the tests fail without a mutant; fix them first:\n{out[-3000:]}')
    return time.monotonic() - began


def report(mutants, outcomes, seed):
    count = {k: outcomes.count(k) for k in ('caught', 'survived', 'uncompiled')}
    compiled = count['caught'] + count['survived']
    share = 100.0 * count['caught'] / compiled if compiled else 0.0
    print(f"\nseed {seed}: {len(outcomes)} of {len(mutants)} mutants tried, "
          f"{count['uncompiled']} did not compile")
    print(f"caught {count['caught']} of {compiled} ({share:.1f}%)")
    survivors = [m for m, outcome in zip(mutants, outcomes) if outcome == 'survived']
    if survivors:
        print('survivors:')
        for m in survivors:
            print('  ' + m.describe())


def campaign(args, mutants):
    space = Workspace(ROOT / args.build_dir, args.jobs, shlex.split(args.ctest_args))
    sums = {rel: checksum(ROOT / rel) for rel in sorted({m.path for m in mutants})}
    for signum in (signal.SIGTERM, signal.SIGHUP):
        signal.signal(signum, on_signal)
    outcomes = []
    try:
        space.configure()
        took = baseline(space)
        timeout = args.timeout or max(60.0, 3 * took)
        print(f'the tests pass in {took:.0f} s; a test of a mutant gets {timeout:.0f} s')
        for n, mutant in enumerate(mutants, 1):
            began = time.monotonic()
            outcome, why = try_mutant(space, mutant, sums, timeout)
            outcomes.append(outcome)
            print(f'[{n}/{len(mutants)}] {outcome:10} {mutant.describe()}'
                  f'{f" ({why})" if why else ""} {time.monotonic() - began:.0f} s', flush=True)
    except KeyboardInterrupt:
        print(f'\ninterrupted after {len(outcomes)} mutants')
    space.recover()  # a second Ctrl-C may have come between a mutant and its restore
    changed = [rel for rel, digest in sums.items() if checksum(ROOT / rel) != digest]
    if changed:
        sys.exit('mutate: these files differ from before the run: ' + ', '.join(changed))
    print('every mutated file is back as it was (checksums match)')
    report(mutants, outcomes, args.seed)
    return 0 if len(outcomes) == len(mutants) else 130


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument('--seed', type=int, default=16, help='picks the mutants (default 16)')
    parser.add_argument('--count', type=int, default=300, help='mutants to try (default 300)')
    parser.add_argument('--paths', default=DEFAULT_PATHS,
                        help='comma-separated product folders (default %(default)s)')
    parser.add_argument('--files', action='append', default=[], metavar='GLOB',
                        help="only files matching GLOB, e.g. 'writer/*' (may be repeated)")
    parser.add_argument('--kinds', default=','.join(KINDS),
                        help='comma-separated kinds of mutation (default all: %(default)s)')
    parser.add_argument('--build-dir', default='build-mut',
                        help='build directory, configured when absent (default %(default)s)')
    parser.add_argument('--ctest-args', default='', help="more ctest arguments, e.g. '-R Writer'")
    parser.add_argument('--timeout', type=float, default=0,
                        help='seconds for one test of a mutant (default: three times the '
                        'unmutated run, at least 60)')
    parser.add_argument('--jobs', type=int, default=0, help='parallel build and test jobs')
    parser.add_argument('--list', action='store_true', help='print the mutants, run nothing')
    args = parser.parse_args()

    kinds = set(args.kinds.split(','))
    if not kinds <= set(KINDS):
        parser.error(f"unknown kind: {', '.join(sorted(kinds - set(KINDS)))}")
    Workspace(ROOT / args.build_dir).recover()
    files = source_files([p for p in args.paths.split(',') if p], args.files)
    if not files:
        parser.error('no source file matches --paths and --files')
    mutants = choose(files, args.count, args.seed, kinds)
    if not mutants:
        parser.error('no mutant chosen: raise --count or widen --paths and --files')
    if args.list:
        for m in mutants:
            print(m.describe())
        print(f'{len(mutants)} mutants in {len({m.path for m in mutants})} files, seed {args.seed}')
        return 0
    return campaign(args, mutants)


if __name__ == '__main__':
    sys.exit(main())
