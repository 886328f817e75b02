#!/usr/bin/python3
"""Reads a workbook with an independent reader and prints its cells for the tests.

Output lines, tab-separated, with \\t \\n \\r \\\\ escaped in texts:
  R <reader>                      which reader answered
  S <index> <visibility> <name>   one per worksheet (visible, hidden, veryhidden)
  C <sheet> <row> <col> <kind> <value>
kinds: n number (repr), s text, b bool (1/0), e error (text), d date (platform serial:
days since 1899-12-30), t csv text (only from the CSV fallbacks).
Usage: oracle.py FILE [--reader xlrd|openpyxl|ssconvert|soffice]
"""
import datetime
import glob
import os
import re
import shutil
import subprocess
import sys
import tempfile
import zipfile


def esc(s):
    return (s.replace('\\', '\\\\').replace('\t', '\\t').replace('\n', '\\n')
            .replace('\r', '\\r'))


XLRD_ERRORS = {0x00: '#NULL!', 0x07: '#DIV/0!', 0x0F: '#VALUE!', 0x17: '#REF!',
               0x1D: '#NAME?', 0x24: '#NUM!', 0x2A: '#N/A'}
EPOCH = datetime.datetime(1899, 12, 30)


def by_xlrd(path, out):
    import xlrd
    book = xlrd.open_workbook(path, formatting_info=False, ragged_rows=True)
    vis = {0: 'visible', 1: 'hidden', 2: 'veryhidden'}
    out.append('R xlrd')
    for i, sh in enumerate(book.sheets()):
        out.append('S\t%d\t%s\t%s' % (i, vis.get(sh.visibility, 'visible'), esc(sh.name)))
        for r in range(sh.nrows):
            for c, cell in enumerate(sh.row(r)):
                t, v = cell.ctype, cell.value
                if t == xlrd.XL_CELL_TEXT:
                    out.append('C\t%d\t%d\t%d\ts\t%s' % (i, r, c, esc(v)))
                elif t == xlrd.XL_CELL_NUMBER:
                    out.append('C\t%d\t%d\t%d\tn\t%r' % (i, r, c, float(v)))
                elif t == xlrd.XL_CELL_DATE:
                    serial = float(v)
                    if book.datemode:
                        serial += 1462
                    elif 1 <= serial < 60:
                        serial += 1
                    out.append('C\t%d\t%d\t%d\td\t%r' % (i, r, c, serial))
                elif t == xlrd.XL_CELL_BOOLEAN:
                    out.append('C\t%d\t%d\t%d\tb\t%d' % (i, r, c, 1 if v else 0))
                elif t == xlrd.XL_CELL_ERROR:
                    out.append('C\t%d\t%d\t%d\te\t%s' % (i, r, c, XLRD_ERRORS.get(v, '#N/A')))


def decode_escapes(s):
    # openpyxl 3.0.9 leaves the format's _xHHHH_ escapes in the text.
    return re.sub(r'_x([0-9A-Fa-f]{4})_', lambda m: chr(int(m.group(1), 16)), s)


def by_openpyxl(path, out):
    import openpyxl
    tmp = None
    try:
        with zipfile.ZipFile(path) as z:
            names = z.namelist()
            if any('\\' in n for n in names):
                # Part names written with backslashes: a copy with '/' for openpyxl.
                fd, tmp = tempfile.mkstemp(suffix='.xlsx')
                os.close(fd)
                with zipfile.ZipFile(tmp, 'w') as w:
                    for n in names:
                        w.writestr(n.replace('\\', '/'), z.read(n))
        book = openpyxl.load_workbook(tmp or path, data_only=True)
    finally:
        if tmp:
            os.unlink(tmp)
    if not book.worksheets:
        raise RuntimeError('no worksheets read')
    out.append('R openpyxl')
    vis = {'visible': 'visible', 'hidden': 'hidden', 'veryHidden': 'veryhidden'}
    epoch = book.epoch
    for i, sh in enumerate(book.worksheets):
        out.append('S\t%d\t%s\t%s' % (i, vis.get(sh.sheet_state, 'visible'), esc(sh.title)))
        # The sheet's own cells only: iter_rows would walk every empty position too.
        for _, cell in sorted(sh._cells.items()):
            v = cell.value
            if v is None:
                continue
            r, c = cell.row - 1, cell.column - 1
            if isinstance(v, bool):
                out.append('C\t%d\t%d\t%d\tb\t%d' % (i, r, c, 1 if v else 0))
            elif isinstance(v, (int, float)):
                out.append('C\t%d\t%d\t%d\tn\t%r' % (i, r, c, float(v)))
            elif isinstance(v, datetime.datetime):
                d = (v - EPOCH).total_seconds() / 86400
                out.append('C\t%d\t%d\t%d\td\t%r' % (i, r, c, d))
            elif isinstance(v, datetime.date):
                d = (datetime.datetime(v.year, v.month, v.day) - EPOCH).days
                out.append('C\t%d\t%d\t%d\td\t%r' % (i, r, c, float(d)))
            elif isinstance(v, datetime.time):
                d = (v.hour * 3600 + v.minute * 60 + v.second + v.microsecond / 1e6) / 86400
                out.append('C\t%d\t%d\t%d\td\t%r' % (i, r, c, d))
            elif isinstance(v, datetime.timedelta):
                d = v.total_seconds() / 86400
                if epoch != EPOCH:
                    d += 1462
                elif 1 <= d < 60:
                    d += 1
                out.append('C\t%d\t%d\t%d\td\t%r' % (i, r, c, d))
            elif cell.data_type == 'e':
                out.append('C\t%d\t%d\t%d\te\t%s' % (i, r, c, v))
            else:
                out.append('C\t%d\t%d\t%d\ts\t%s' % (i, r, c, esc(decode_escapes(str(v)))))


def csv_cells(files, out):
    import csv
    for i, f in enumerate(files):
        with open(f, newline='', encoding='utf-8') as h:
            for r, row in enumerate(csv.reader(h)):
                for c, v in enumerate(row):
                    if v != '':
                        out.append('C\t%d\t%d\t%d\tt\t%s' % (i, r, c, esc(v)))


def by_ssconvert(path, out):
    d = tempfile.mkdtemp()
    try:
        p = subprocess.run(['ssconvert', '-S', path, os.path.join(d, 'sheet_%n.csv')],
                           capture_output=True, timeout=120)
        files = sorted(glob.glob(os.path.join(d, 'sheet_*.csv')),
                       key=lambda f: int(re.search(r'_(\d+)\.csv$', f).group(1)))
        if p.returncode != 0 or not files:
            raise RuntimeError('ssconvert failed')
        out.append('R ssconvert')
        csv_cells(files, out)
    finally:
        shutil.rmtree(d, ignore_errors=True)


def by_soffice(path, out):
    d = tempfile.mkdtemp()
    try:
        subprocess.run(['soffice', '-env:UserInstallation=file://' + d + '/profile',
                        '--headless', '--norestore', '--convert-to',
                        'csv:Text - txt - csv (StarCalc):44,34,76,1,,0,false,true,false,false,false,-1',
                        '--outdir', d + '/out', path], capture_output=True, timeout=300)
        files = sorted(glob.glob(d + '/out/*.csv'))
        if not files:
            raise RuntimeError('soffice wrote no CSV')
        out.append('R soffice')
        # One CSV per sheet, named STEM-SHEET.csv: the names say which sheet it is.
        stem = os.path.splitext(os.path.basename(path))[0]
        for i, f in enumerate(files):
            name = os.path.basename(f)[len(stem) + 1:-len('.csv')]
            out.append('S\t%d\tvisible\t%s' % (i, esc(name)))
        csv_cells(files, out)
    finally:
        shutil.rmtree(d, ignore_errors=True)


def main():
    path = sys.argv[1]
    readers = [by_xlrd, by_ssconvert, by_soffice] if path.lower().endswith('.xls') else \
        [by_openpyxl, by_ssconvert, by_soffice]
    if '--reader' in sys.argv:
        name = sys.argv[sys.argv.index('--reader') + 1]
        readers = [globals()['by_' + name]]
    errors = []
    for reader in readers:
        out = []
        try:
            reader(path, out)
        except Exception as e:  # the next reader may manage
            errors.append('%s: %s' % (reader.__name__, e))
            continue
        sys.stdout.write('\n'.join(out) + '\n')
        return 0
    sys.stderr.write('no reader could read %s: %s\n' % (path, '; '.join(errors)))
    return 1


if __name__ == '__main__':
    sys.exit(main())
