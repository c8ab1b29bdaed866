// The report of a batch: what is on the page, that names in it do nothing, and how a browser shows it.
#include "tarsel/batch/report.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>

#include "tarsel/words/json.h"
#include "tests/support/process.h"
#include "tests/support/temp_folder.h"

namespace {

using testing::HasSubstr;
using testing::Not;

// One pixel, red.
std::string smallPng() {
    static constexpr unsigned char bytes[] = {
        0x89, 0x50, 0x4e, 0x47, 0x0d, 0x0a, 0x1a, 0x0a, 0x00, 0x00, 0x00, 0x0d, 0x49, 0x48,
        0x44, 0x52, 0x00, 0x00, 0x00, 0x01, 0x00, 0x00, 0x00, 0x01, 0x08, 0x02, 0x00, 0x00,
        0x00, 0x90, 0x77, 0x53, 0xde, 0x00, 0x00, 0x00, 0x0c, 0x49, 0x44, 0x41, 0x54, 0x78,
        0x9c, 0x63, 0xf8, 0xcf, 0xc0, 0x00, 0x00, 0x03, 0x01, 0x01, 0x00, 0xc9, 0xfe, 0x92,
        0xef, 0x00, 0x00, 0x00, 0x00, 0x49, 0x45, 0x4e, 0x44, 0xae, 0x42, 0x60, 0x82};
    return {reinterpret_cast<const char*>(bytes), sizeof bytes};
}

const std::string kHostile =
    "/in/<script>document.title='owned'</script>\"'><img src=x "
    "onerror=document.title='owned'>\xff\x1b[31m.wav";

BatchResult someResult() {
    BatchResult result;
    result.list = "/lists/<b>night.xml";
    result.start = 1700000000;
    result.seconds = 3725;
    result.status = 1;
    BatchTaskResult done;
    done.number = 1;
    done.id = "0123456789ab";
    done.end = TaskEnd::done;
    done.inputs = {"/in/" + std::string(180, 'w') + ".wav", kHostile};
    done.output = "/out/card_%04d.png";
    done.written = {"/out/card_0000.png"};
    done.start = 1700000001;
    done.seconds = 65;
    done.speed = 12.345;
    done.attempts = 2;
    done.warnings = {"one & <two>"};
    done.status = 0;
    BatchTaskResult failed = done;
    failed.number = 2;
    failed.end = TaskEnd::failed;
    failed.written.clear();
    failed.speed = -1;
    failed.status = 3;
    failed.failure = "can't open 'x': </li></ol> no such file";
    BatchTaskResult idle;
    idle.number = 3;
    result.tasks = {done, failed, idle};
    return result;
}

std::string pictureOf(const BatchTaskResult& task) { return task.number == 1 ? smallPng() : ""; }

TEST(Report, SaysWhatBecameOfEachTask) {
    const std::string page = reportPage(someResult(), pictureOf);
    for (const char* text :
         {"1 h 02 min", "1 min 05 s", "12.35&times;", "<b>1</b> done", "<b>1</b> failed or stopped",
          "<b>1</b> not run", "one &amp; &lt;two&gt;", "card_0000.png", "<dd>2</dd>", "can&#39;t open"})
        EXPECT_THAT(page, HasSubstr(text));
    EXPECT_THAT(page, Not(HasSubstr("<script")));
    EXPECT_THAT(page, Not(HasSubstr("<img src")));
    EXPECT_THAT(page, Not(HasSubstr("<b>night")));
    EXPECT_EQ(page.find('\x1b'), std::string::npos);
    EXPECT_EQ(page.find('\xff'), std::string::npos);
    // The only picture, and nothing from elsewhere.
    EXPECT_EQ(page.find("src=\""), page.rfind("src=\""));
    EXPECT_THAT(page, HasSubstr("src=\"data:image/png;base64,iVBORw0KGgo"));
    EXPECT_THAT(page, Not(HasSubstr("http:")));
    EXPECT_THAT(page, Not(HasSubstr("https:")));

    const Json json = Json::parse(reportJson(someResult(), pictureOf));
    EXPECT_EQ(json["start"], "2023-11-14T22:13:20Z");
    ASSERT_EQ(json["tasks"].size(), 3u);
    EXPECT_EQ(json["tasks"][0]["speed"], 12.345);
    EXPECT_TRUE(json["tasks"][1]["speed"].is_null());
    EXPECT_EQ(json["tasks"][1]["failure"], "can't open 'x': </li></ol> no such file");
    EXPECT_TRUE(json["tasks"][2]["start"].is_null());
    EXPECT_THAT(json["tasks"][0]["picture"].get<std::string>(), HasSubstr("AElFTkSuQmCC"));
}

TEST(Report, IsWrittenWhole) {
    const TempFolder folder;
    EXPECT_THROW(ReportFile(folder.file("report.txt"), {}, OutputPolicy(false)), std::exception);
    ReportFile(folder.file("report.html"), {}, OutputPolicy(false)).write(someResult(), pictureOf);
    EXPECT_THAT(TempFolder::read(folder.file("report.html")), testing::EndsWith("</html>\n"));
    EXPECT_THROW(ReportFile(folder.file("report.html"), {}, OutputPolicy(false)), std::exception)
        << "it exists";
    ReportFile(folder.file("report.json"), {}, OutputPolicy(false)).write(someResult(), pictureOf);
    EXPECT_TRUE(Json::accept(TempFolder::read(folder.file("report.json"))));
}

// What a browser makes of the page in a window of some width, measured by a page around it.
std::string measured(const TempFolder& folder, int width) {
    const std::string frame =
        R"(<!DOCTYPE html><body><iframe id="f" src="report.html" style="border:0;width:)" +
        std::to_string(width) + R"(px;height:900px"></iframe><script>
const f = document.getElementById('f');
f.onload = () => {
  const d = f.contentDocument, e = d.documentElement, i = d.images;
  document.body.dataset.seen = [d.title, 'wide:' + (e.scrollWidth > )" +
        std::to_string(width) + R"(), 'pictures:' + i.length + ':' + i[0].naturalWidth,
    'tasks:' + d.querySelectorAll('li.task').length, 'scripts:' + d.scripts.length,
    'loaded:' + f.contentWindow.performance.getEntriesByType('resource').filter(r => !r.name.startsWith('data:')).length
  ].join(' ');
};
</script></body>)";
    folder.write("frame.html", frame);
    const Outcome o =
        runProgram({"chromium", "--headless=new", "--no-sandbox", "--disable-gpu",
                    "--allow-file-access-from-files", "--disable-dev-shm-usage",
                    "--user-data-dir=" + folder.file("profile"), "--virtual-time-budget=10000",
                    "--window-size=1400,1000", "--dump-dom", "file://" + folder.file("frame.html")});
    const size_t at = o.out.find("data-seen=\"");
    return at == std::string::npos ? o.err : o.out.substr(at + 11, o.out.find('"', at + 11) - at - 11);
}

TEST(Report, FitsAPhoneAndAScreen) {
    if (std::system("command -v chromium >/dev/null 2>&1") != 0) GTEST_SKIP() << "chromium is not installed";
    const TempFolder folder;
    folder.write("report.html", reportPage(someResult(), pictureOf));
    for (const int width : {400, 1280})
        EXPECT_EQ(measured(folder, width),
                  "&lt;b&gt;night.xml wide:false pictures:1:1 tasks:3 scripts:0 loaded:0")
            << width;
}

}  // namespace
