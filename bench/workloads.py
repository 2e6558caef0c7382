"""The workloads, who works on them, and the goals."""

import statistics

from make_workload import RECORDS, share_of
from measuring import Contender, Workload

STARTS = 200


class Goal:
    """One measure of a contender, alone or over another's of the same round, and its bound."""

    def __init__(self, mine, other, measure, at_most=None, at_least=None):
        self.mine, self.other, self.measure = mine, other, measure
        self.at_most, self.at_least = at_most, at_least

    def value(self, workload):
        """None where one of the two was not measured."""
        mine = workload.named(self.mine)
        other = workload.named(self.other) if self.other else None
        if mine is None or (self.other and other is None):
            return None
        if self.measure in ("cpu", "wall"):
            if other is None:
                return mine.typical(self.measure)
            return median_ratio(mine.seconds(self.measure), other.seconds(self.measure))
        of = {"memory": lambda each: each.memory, "calls": lambda each: each.calls}[self.measure]
        return of(mine) / of(other) if other else of(mine)

    def text(self):
        return f"{self.mine} : {self.other}" if self.other else self.mine

    def is_met(self, value):
        return value <= self.at_most if self.at_most is not None else value >= self.at_least


class Growth(Goal):
    """What one more asset costs among many, over what it costs among fewer."""

    def __init__(self, names, measure, at_most):
        super().__init__(names[2], names[1], measure, at_most=at_most)
        self.names = names

    def text(self):
        return f"one more of {self.mine} : of {self.other}"

    def value(self, workload):
        sizes = [workload.named(name) for name in self.names]
        if None in sizes:
            return None
        total = {"cpu": lambda each: each.typical("cpu") * each.count,
                 "memory": lambda each: each.memory}[self.measure]
        few, some, many = map(total, sizes)
        fewer, more = (later.count - earlier.count for earlier, later in zip(sizes, sizes[1:]))
        return (many - some) / more / ((some - few) / fewer)


def median_ratio(mine, others):
    pairs = [a / b for a, b in zip(mine, others) if b > 0]
    return statistics.median(pairs) if pairs else None


def at_least(bound, others, measure="cpu"):
    return [Goal(other, "library", measure, at_least=bound) for other in others]


class Makers:
    """Makes the contenders that several workloads have, from the programs of a build."""

    def __init__(self, build):
        self.build = build
        self.parvel = build / "bin" / "parvel"

    def bench(self, name):
        return self.build / "bench" / f"bench_{name}"

    def floor(self, name, *words):
        return Contender("floor", [self.bench(f"floor_{name}"), "{list}", *words], "floor")

    def peer(self, name, program, *words, **more):
        return Contender(name, [self.bench(program), "{list}", *words], **more)

    def library(self, *words, name="library", files=None):
        return Contender(name, [self.bench("inspect"), "{list}", *words], "library", files=files)

    def bring(self, *words, name="library", role="library"):
        return Contender(name, [self.bench("bring"), "{list}", "{into}", *words], role)

    def mutagen(self):
        python = "/usr/bin/python3"
        script = self.build.parents[1] / "bench/peers/mutagen_tags.py"
        return Contender("mutagen", [python, script, "{list}"],
                         needs=[python, "-c", "import mutagen"])


def workloads(build, share):
    make = Makers(build)
    yield from book_workloads(make)
    yield from pdf_workloads(make)
    yield from audio_workloads(make)
    yield from writing_workloads(make)
    yield from program_workloads(make)
    yield check_workload(make, share)


def book_workloads(make):
    def peers():
        return [make.peer("ebook-tools", "ebook_tools"),
                make.peer("KFileMetaData", "kfilemetadata", "application/epub+zip"),
                make.peer("libgepub", "gepub", sift=[str(make.bench("gepub")), "{list}", "sift"])]

    yield Workload("zipped book", "books", [make.floor("book"), make.library(), *peers()],
                   [Goal("library", "floor", "cpu", at_most=1.3),
                    *at_least(3, ("ebook-tools", "KFileMetaData")), *at_least(8, ("libgepub",)),
                    Goal("library", None, "calls", at_most=20)], at_least=2000)
    yield Workload("zipped book, cold", "books", [make.floor("book"), make.library(), *peers()],
                   at_least(2, ("ebook-tools", "KFileMetaData", "libgepub"), "wall"), cold=True)
    yield Workload("expanded package", "packages", [
        make.floor("package"), make.library(),
        make.library(name="the same, zipped", files="packages-zipped")],
        [Goal("library", "the same, zipped", "cpu", at_most=1.0)], at_least=1500)


def pdf_workloads(make):
    yield Workload("PDF information, identity stored", "pdfs", [
        make.floor("pdf"), make.library(),
        make.peer("KFileMetaData", "kfilemetadata", "application/pdf"),
        make.peer("poppler-glib", "poppler_glib"), make.peer("poppler-cpp", "poppler_cpp"),
        Contender("pdfinfo", ["pdfinfo", "{file}"], each=50)],
        at_least(4, ("KFileMetaData", "poppler-glib", "poppler-cpp")), at_least=1000)
    yield Workload("PDF of 200 MB with its MD5", "large-pdf", [
        Contender("openssl md5", ["openssl", "md5", "{file}"], "floor", each=1), make.library()],
        [Goal("library", "openssl md5", "cpu", at_most=1.05)])
    yield Workload("PDF cover", "pdfs", [
        make.floor("pdf", "cover"), make.library("cover"),
        make.peer("poppler-cpp", "poppler_cpp", "cover"),
        make.peer("poppler-glib", "poppler_glib", "cover"),
        Contender("pdftoppm", ["pdftoppm", "-png", "-singlefile", "-scale-to", "380", "{file}"],
                  each=50)],
        [*at_least(1, ("poppler-cpp",)), *at_least(2.2, ("poppler-glib",)),
         *at_least(1.7, ("pdftoppm",))])


def audio_workloads(make):
    for name, files, many in (("m4a", "audiobooks", 3000),
                              ("m4a over 100 MB", "large-audiobooks", 1500)):
        yield Workload(name, files, [
            make.floor("audiobook"), make.library(), make.peer("TagLib", "taglib"),
            make.peer("libavformat", "avformat"), make.mutagen()],
            [*at_least(6, ("TagLib",)), *at_least(10, ("libavformat",))], at_least=many)


def writing_workloads(make):
    def copies():
        return [make.floor("copy", "{into}"), make.bring("copy", "progress"),
                Contender("cp", ["cp", "--preserve=xattr", "{file}", "{into}"], each=1),
                Contender("rsync", ["rsync", "--xattrs", "--progress", "{file}", "{into}"],
                          each=1),
                Contender("gio", ["gio", "copy", "--progress", "{file}", "{into}"], each=1)]

    yield Workload("expanding, in memory", "expanded-books", [
        make.floor("expand", "{into}"), make.bring("expand"),
        make.peer("libarchive", "libarchive", "{into}"),
        Contender("unzip", ["unzip", "-qq", "{file}", "-d", "{into}"], each=40),
        Contender("bsdtar", ["bsdtar", "-xf", "{file}", "-C", "{into}"], each=40),
        Contender("7z", ["7z", "x", "-bd", "-y", "-o{into}", "{file}"], each=40)],
        [*at_least(1.7, ("libarchive",)), *at_least(3, ("unzip", "bsdtar", "7z"))],
        place="memory", brings=True)
    for place, where in (("memory", "in memory"), ("disk", "on the disk")):
        yield Workload(f"copying 170 MB with progress, {where}", "copied", copies(),
                       [*at_least(1.4, ("cp",)), *at_least(2.2, ("rsync",))], place=place,
                       brings=True, at_least=4)
    yield Workload("copying 170 MB with progress, extents shared", "copied", copies(),
                   [Goal("library", None, "cpu", at_most=0.001)], place="shared", brings=True,
                   at_least=4)
    yield Workload("install of a book", "expanded-books", [
        make.bring("install"),
        make.bring("install", "progress", name="with progress", role="peer")],
        [Goal("with progress", "library", "cpu", at_most=1.1)], place="memory", brings=True)


def program_workloads(make):
    def inspect(*words):
        return [make.parvel, "inspect", "--jsonl", *words, "--files-from", "{list}"]

    yield Workload("the program over zipped books", "books", [
        Contender("library", inspect("-j1"), "library"), Contender("parvel -j2", inspect("-j2")),
        Contender("exiftool", ["exiftool", "-json", "-@", "{list}"], limit=100),
        Contender("ebook-meta", ["ebook-meta", "{file}"], each=3)],
        [*at_least(40, ("exiftool",)), *at_least(1000, ("ebook-meta",)),
         Goal("library", "parvel -j2", "wall", at_least=1.7)], at_least=2000)
    yield Workload("the program's memory", "books", [
        Contender("listed once", inspect(), "library"),
        Contender("listed 100 times", inspect(), times=100)],
        [Goal("listed 100 times", "listed once", "memory", at_most=1.1)], rounds=1)
    yield Workload("start of the program", None, [
        Contender("true", ["/bin/true"], "floor", each=STARTS),
        Contender("its libraries alone", [make.bench("floor_start")], each=STARTS),
        Contender("library", [make.parvel, "--version"], "library", each=STARTS)],
        [Goal("library", "true", "cpu", at_most=5)], per="start")


def check_workload(make, share):
    def check(number):
        return Contender(f"{number:,} records",
                         [make.parvel, "check", "--records",
                          f"{{workload}}/records-{number}.json", f"{{workload}}/shelf-{number}"],
                         assets=number)

    checks = [check(share_of(number, share)) for number in RECORDS]
    names = [each.name for each in checks]
    return Workload("check", None, checks, [Growth(names, measure, at_most=1.5)
                                            for measure in ("cpu", "memory")], per="record")
