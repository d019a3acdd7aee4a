#!/usr/bin/env python3
"""Checks the examples of docs/format.md against the built tools.

Usage: check_format_doc.py FORMAT.md BIN_DIR

Annotations (HTML comments right before a fenced block):
  <!-- example: NAME [status=N] [opts=-l,-p] [roundtrip=no] -->   ```vrx  a whole file
  <!-- excerpt: NAME -->                                           ```vrx  lines of example NAME
  <!-- output: NAME -->                                            ```vrx  what hxb2vrx writes for NAME
  <!-- messages: NAME -->                                          ```text lines the run of NAME prints
Every ```vrx block must carry one of them.
"""
import os
import re
import shutil
import subprocess
import sys
import tempfile

if len(sys.argv) != 3:
    sys.exit('usage: check_format_doc.py FORMAT.md BIN_DIR')
DOC, BIN = os.path.abspath(sys.argv[1]), os.path.abspath(sys.argv[2])
HEADER = re.compile(r'^// Created .* by Vondrel package hxb2vrx: Version Quillate$')

text = open(DOC, encoding='utf-8').read()
blocks = []  # (annotation or None, language, body, line)
pending = None
lines = text.split('\n')
i = 0
while i < len(lines):
    line = lines[i]
    m = re.match(r'^<!-- (example|excerpt|output|messages): (\S+)(.*?)-->$', line.strip())
    if m:
        pending = (m.group(1), m.group(2), m.group(3).strip(), i + 1)
        i += 1
        continue
    f = re.match(r'^(\s*)```(\w*)\s*$', line)
    if f:
        indent, lang = f.group(1), f.group(2)
        body = []
        i += 1
        while not re.match(r'^\s*```\s*$', lines[i]):
            body.append(lines[i][len(indent):] if lines[i].startswith(indent) else lines[i])
            i += 1
        blocks.append((pending, lang, '\n'.join(body) + '\n', i))
        pending = None
    elif line.strip():
        pending = None if not line.startswith('<!--') else pending
    i += 1

failures = []
work = tempfile.mkdtemp(prefix='fmtdoc.')
runs = {}


def run(args, cwd):
    return subprocess.run(args, cwd=cwd, capture_output=True, text=True)


def body_lines(output):
    return [l.rstrip('\r') for l in output.split('\n')]


def convert(name, body, status, opts, roundtrip):
    src = os.path.join(work, name + '.vrx')
    open(src, 'w', encoding='utf-8').write(body)
    ext = 'hxl' if '-l' in opts else 'hxb'
    r = run([os.path.join(BIN, 'vrx2hxb'), *opts, '-o', name + '.' + ext, name + '.vrx'], work)
    info = {'status': r.returncode, 'messages': (r.stdout + r.stderr).split('\n')}
    if r.returncode != status:
        failures.append(f'{name}: vrx2hxb status {r.returncode}, expected {status}\n{r.stdout}{r.stderr}')
        return info
    if r.returncode not in (0, 3):
        return info
    w = run([os.path.join(BIN, 'hxb2vrx'), name + '.' + ext, name + '.out.vrx'], work)
    info['write_messages'] = (w.stdout + w.stderr).split('\n')
    if w.returncode != 0:
        failures.append(f'{name}: hxb2vrx status {w.returncode}\n{w.stderr}')
        return info
    out = open(os.path.join(work, name + '.out.vrx'), encoding='utf-8', newline='').read()
    info['output'] = out
    if roundtrip:
        r2 = run([os.path.join(BIN, 'vrx2hxb'), *opts, '-o', name + '.2.' + ext, name + '.out.vrx'], work)
        w2 = run([os.path.join(BIN, 'hxb2vrx'), name + '.2.' + ext, name + '.2.vrx'], work)
        if r2.returncode != status or w2.returncode != 0:
            failures.append(f'{name}: written text does not read back ({r2.returncode}, {w2.returncode})\n{r2.stderr}')
        else:
            again = open(os.path.join(work, name + '.2.vrx'), encoding='utf-8', newline='').read()
            strip = lambda t: re.sub(r'OBJ_\$[0-9a-f]+', 'OBJ_$', t.split('\n', 1)[1])
            if strip(again) != strip(out):
                failures.append(f'{name}: round trip not stable')
    return info


for ann, lang, body, line in blocks:
    if ann is None:
        if lang == 'vrx':
            failures.append(f'line {line}: vrx block without annotation')
        continue
    kind, name, rest, _ = ann
    params = dict(p.split('=', 1) for p in rest.split()) if rest else {}
    if kind == 'example':
        opts = [o for o in params.get('opts', '').split(',') if o]
        runs[name] = convert(name, body, int(params.get('status', '0')), opts,
                             params.get('roundtrip', 'yes') == 'yes')
        runs[name]['text'] = body
    elif name not in runs:
        failures.append(f'line {line}: {kind} of unknown example {name}')
    elif kind == 'excerpt':
        whole = runs[name]['text']
        if body.strip('\n') not in whole:
            failures.append(f'line {line}: excerpt not found in example {name}:\n{body}')
    elif kind == 'output':
        out = runs[name].get('output')
        if out is None:
            failures.append(f'line {line}: example {name} has no output')
            continue
        got = body_lines(out)
        want = body.split('\n')
        if got and HEADER.match(got[0]) and want and HEADER.match(want[0]):
            got, want = got[1:], want[1:]
        norm = lambda ls: [re.sub(r'OBJ_\$[0-9a-f]+', 'OBJ_$', l) for l in ls if l != '']
        if norm(got) != norm(want):
            failures.append(f'line {line}: output of {name} differs:\n' + '\n'.join(got))
    elif kind == 'messages':
        said = [l.rstrip() for l in runs[name]['messages'] + runs[name].get('write_messages', [])]
        for want in body.split('\n'):
            if want.strip() and want.rstrip() not in said:
                failures.append(f'line {line}: {name} did not print: {want}\n  got: ' + '\n  '.join(said))

checked = sum(1 for b in blocks if b[0])
print(f'{checked} annotated blocks, {len(runs)} examples run, {len(failures)} failures')
for f in failures:
    print('FAIL', f)
shutil.rmtree(work, ignore_errors=True)
sys.exit(1 if failures else 0)
