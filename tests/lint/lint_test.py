"""The lints of the tree find what they are for: each fault is planted in a small tree of its own."""
import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).parent))
import door
import oneclass
import rooms

ROOT = pathlib.Path(__file__).resolve().parents[2]


class Planted(unittest.TestCase):
    def tree(self, files):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        for name, text in files.items():
            file = pathlib.Path(folder.name) / name
            file.parent.mkdir(parents=True, exist_ok=True)
            file.write_text(text)
        return pathlib.Path(folder.name)

    def test_include_that_goes_up_or_sideways(self):
        table = rooms.read_rooms()
        cases = {
            "core/value/any.cpp": '#include "core/media/qvframe.h"\n',
            "core/value/any_p.h": '#  include <core/value/../media/qvframe.h>\n',
            "core/arch/posix/files.cpp": "int a;\n#include <core/measure/rect.h>\n",
            "core/engine/log/qvlog.cpp": '#include "core/engine/files/qvfileutil.h"\n',
            "builtin/muxers/rawmux.cpp": '#include "builtin/sinks/qvfilebuiltins.h"\n',
            "core/job/filtersstate.cpp": '#include "builtin/creators.h"\n',
            "core/drawer/thing.cpp": "\n",
            "tarsel/job/job.cpp": '#include "core/value/any.h"\n',
            "plugins/av/avdec.cpp": '#include "core/value/numbertext_p.h"\n',
        }
        for name, text in cases.items():
            with self.subTest(name):
                self.assertEqual(len(rooms.check(self.tree({name: text}), table)), 1)

    def test_includes_that_go_down(self):
        files = {
            "core/media/qvframe.cpp": '#include "core/value/any.h"\n#include "core/media/rows_p.h"\n#include <vector>\n',
            "builtin/video/levels/brightness.cpp": '#include "builtin/kernels/lines/samplerows.h"\n',
            "tarsel/job/job.cpp": '#include <qvplugcore/qvplugcore.h>\n#include "tarsel/words/failure.h"\n',
        }
        self.assertEqual(rooms.check(self.tree(files), rooms.read_rooms()), [])

    def test_folder_that_is_too_full(self):
        files = {f"core/value/unit{n}.h": "" for n in range(rooms.MOST_FILES + 1)}
        self.assertEqual(len(rooms.check(self.tree(files), rooms.read_rooms())), 1)

    def test_calls_of_the_system(self):
        lines = ['std::FILE* f = fopen(name, "rb");', "std::ifstream in(name);", "#include <unistd.h>",
                 'const char* home = std::getenv("HOME");', "auto now = std::chrono::steady_clock::now();",
                 "worker_ = std::thread(&Job::work, this);", "std::thread worker([] {});", "std::random_device entropy;",
                 "if (std::filesystem::exists(name)) return;", 'system("ls");', "std::remove(name.c_str());",
                 "FT_New_Face(library, name, 0, &face);"]
        for line in lines:
            with self.subTest(line):
                tree = self.tree({"core/media/unit.cpp": line, "core/arch/posix/unit.cpp": line,
                                  "tarsel/host/unit.cpp": line, "tarsel/job/unit.cpp": line})
                found = [fault.split(":")[0] for fault in door.check(tree)]
                self.assertEqual(found, ["core/media/unit.cpp", "tarsel/job/unit.cpp"])

    def test_what_only_looks_like_a_call(self):
        text = ('static void* fopen(const Any& name);\nfile = QvFile::fopen(name, "rb");\nint open();\n'
                "std::thread worker_;\nthen.system(1);\n// std::getenv(name)\nlog(\"fopen(x)\");\n"
                "std::remove(list.begin(), list.end(), 0);\nusing Time = std::chrono::milliseconds;\n")
        self.assertEqual(door.check(self.tree({"core/media/unit.cpp": text})), [])

    def test_class_in_several_sources(self):
        first = "int Thing::a() { return 1; }\n"
        for second in ("void Thing::b() {}", "Thing::Thing() = default;", "Thing::~Thing() {}",
                       "int Thing::count_ = 0;", "std::unique_ptr<Part>\nThing::c(int x) {\n}",
                       "Thing::Inner* Thing::find(int) { return nullptr; }", "Thing::Inner::Inner() {}",
                       "bool Thing::operator==(const Thing&) const {", "struct Thing::Private {\n    int a;\n};",
                       "namespace qv {\nint qv::Thing::d() {}\n}"):
            with self.subTest(second):
                tree = self.tree({"core/media/a.cpp": first, "core/media/b.cpp": "#include <a>\n" + second})
                self.assertEqual([fault.split(":")[0] for fault in oneclass.check(tree, ())], ["Thing"])
                self.assertEqual(oneclass.check(tree, ("Thing",)), [])

    def test_class_that_only_seems_to_be_in_several_sources(self):
        own = "namespace {\nclass Thing final : Base {\n    void a();\n};\nvoid Thing::a() {}\n}\n"
        files = {"core/media/a.cpp": "int Thing::a() { return Other::b(); }\n// Other::c() {}\nusing Other::d;\n",
                 "core/media/b.cpp": "int Other::b() {\n    Thing::a();\n}\nconst int x = Thing::a();\n",
                 "core/media/c.cpp": "Thing::Inner make(int) {}\nstatic_assert(Thing::size == 1);\n",
                 "core/media/d.cpp": own, "core/media/e.cpp": "template <class T>\nint Thing<T>::a() {}\n",
                 "core/media/g.h": "namespace names {\nint f();\n}\n", "core/media/g.cpp": "int names::f() {}\n",
                 "core/media/h.cpp": "int names::g() {}\nvoid QvUtil::a() {}\n", "core/media/i.cpp": "void QvUtil::b() {}\n"}
        self.assertEqual(oneclass.check(self.tree(files), ()), [])

    def test_members_that_return_what_is_above_their_class(self):
        files = {"core/measure/rate.cpp": "int Rate::a() {}\n", "core/value/measurevalues.cpp": "Any Rate::b() {}\n"}
        self.assertEqual(oneclass.check(self.tree(files), ()), [])
        files["core/value/any.cpp"] = "Any Rate::c() {}\n"
        self.assertEqual(len(oneclass.check(self.tree(files), ())), 1)

    def test_list_of_classes_in_several_sources_gets_shorter(self):
        self.assertEqual(len(oneclass.check(self.tree({"core/media/a.cpp": "int Thing::a() {}\n"}), ("Thing",))), 1)


class Documents(unittest.TestCase):
    def test_architecture_prints_the_table(self):
        page = (ROOT / "docs/architecture.md").read_text()
        shown = page.split("<!-- rooms -->")[1].split("<!-- /rooms -->")[0].strip()
        self.assertEqual(shown, rooms.table(rooms.read_rooms()))

    def test_every_room_exists(self):
        for folder in rooms.read_rooms():
            self.assertTrue((ROOT / folder).is_dir(), folder)


if __name__ == "__main__":
    unittest.main()
