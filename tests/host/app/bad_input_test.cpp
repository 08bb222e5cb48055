// Bad input of every kind handed to the program as a user would: each case ends with a failing
// status and one line that names the file or option and the problem, and leaves no file behind.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "test_files.h"

namespace ostrel {
namespace {

namespace fs = std::filesystem;
using Json = nlohmann::ordered_json;

std::set<std::string> Entries(const fs::path& folder) {
    std::set<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(folder))
        names.insert(fs::relative(entry.path(), folder).string());
    return names;
}

// The cards example and, beside it, every kind of broken file the cases name.
void MakeFiles(const TempFolder& folder) {
    fs::copy(fs::path(OSTREL_EXAMPLES_DIR) / "cards", folder.Path(), fs::copy_options::recursive);
    std::vector<uint8_t> pixels(64 * 64 * 4, 200);
    for (const char* type : {"png", "jpg", "tif", "exr"}) {
        std::string name = std::string("whole.") + type;
        std::string bytes = ReadAll(folder.WriteImage(name, 64, 64, 4, pixels));
        folder.WriteText(std::string("cut.") + type, bytes.substr(0, bytes.size() / 2));
        fs::remove(folder.Path() / name);
    }
    std::string png = ReadAll(folder.Path() / "grid.png");
    png[png.find("IDAT") + 12] ^= 0x40;  // its checksum no longer holds
    folder.WriteText("checksum.png", png);
    // Headers that claim what no machine holds (280 GB to decode) or what no layer may be.
    folder.WriteText("huge.ppm", "P6\n100000 100000\n255\nabc");
    folder.WriteText("wide.ppm", "P6\n40000 1\n255\nabc");
    folder.WriteText("empty.png", "");
    folder.WriteText("text.png", "not an image\n");
    fs::create_directory(folder.Path() / "folder.png");
    ::mkfifo((folder.Path() / "fifo.png").c_str(), 0600);
    ::mkfifo((folder.Path() / "fifo.json").c_str(), 0600);
    folder.WriteText("broken.json", R"({"width": 64, "height": )");
    folder.WriteText("empty.json", "");
    folder.WriteText("list.json", "[]");
    folder.WriteText("nested.json", std::string(100000, '['));
    folder.WriteText("binary.json", std::string("\x89PNG\r\n\x1a\n\0\0", 10));
    std::ofstream(folder.Path() / "large.json").close();
    fs::resize_file(folder.Path() / "large.json", 65 << 20);
    fs::create_directory(folder.Path() / "taken");
    folder.WriteText("taken/f.0000.png", "");
}

// Edits of the cards composition: "/json/pointer=value" sets, "-/json/pointer" removes;
// several are separated by " & ". {LONG} stands for a name longer than a file name can be.
Json Edited(Json comp, std::string edits) {
    if (size_t at = edits.find("{LONG}"); at != std::string::npos)
        edits.replace(at, 6, std::string(300, 'n'));
    std::istringstream list(edits);
    for (std::string edit; std::getline(list, edit, '&');) {
        edit.erase(0, edit.find_first_not_of(' '));
        edit.erase(edit.find_last_not_of(' ') + 1);
        if (edit.empty()) continue;
        if (edit[0] == '-') {
            Json::json_pointer pointer(edit.substr(1));
            comp.at(pointer.parent_pointer()).erase(pointer.back());
        } else {
            size_t equals = edit.find('=');
            comp[Json::json_pointer(edit.substr(0, equals))] = Json::parse(edit.substr(equals + 1));
        }
    }
    return comp;
}

struct Case {
    const char* edits;      // of the cards composition, written to c.json
    const char* arguments;  // of the program; "" renders frame 0 of c.json to f.####.png
    const char* message;    // the parts of the one line, in order, separated by "…"
};

const Case kCases[] = {
    // The composition's settings.
    {"/width=0", "", "c.json: width: must be"},
    {"/width=960.5", "", "c.json: width: expected a whole number"},
    {"-/height", "", "c.json: height: is required"},
    {"/duration=0", "", "c.json: duration: "},
    {"-/duration", "", "c.json: duration: is required"},
    {"/frameRate=0", "", "c.json: frameRate: "},
    {"/frameRate=23.976", "", "c.json: frameRate: give a fractional rate as [numerator"},
    {"/frameRate=[24000]", "", "c.json: frameRate: expected [numerator, denominator]"},
    {"/frameRate=[24000, 0]", "", "c.json: frameRate[1]: "},
    {"/frameRate=[1000000, 1]", "", "c.json: frameRate: must be at most 1000 frames per second"},
    {"/bitDepth=12", "", "c.json: bitDepth: must be 8, 16 or 32, got 12"},
    {"/pixelAspect=0", "", "c.json: pixelAspect: "},
    {"/background=\"#12345\"", "", "c.json: background: "},
    {"/background=\"teal\"", "", "c.json: background: "},
    {"/motionBlur={\"samplesPerFrame\": 0}", "", "c.json: motionBlur.samplesPerFrame: "},
    {"/motionBlur={\"shutterAngle\": 90.5}", "", "c.json: motionBlur.shutterAngle: "},
    {"/motionBlur={\"shutterPhase\": -361}", "", "c.json: motionBlur.shutterPhase: "},
    {"/motionBlur={\"enabled\": \"yes\"}", "", "c.json: motionBlur.enabled: expected"},
    {"/lightsAndDepthOfField=1", "", "c.json: lightsAndDepthOfField: expected"},
    {"/blending={\"gamma\": 0}", "", "c.json: blending.gamma: "},
    {"/blending={\"linear\": true, \"gama\": 2}", "", "c.json: blending: unknown key \"gama\""},
    {"/renderer={\"shadowMapSize\": 600}", "",
     "c.json: renderer.shadowMapSize: got 600; the renderer offers \"Comp Size\", 250, 500, 750, "
     "1000, 1500, 2000, 3000, 4000"},
    {"/rendererOptions=\"\" & /renderer={\"shadowMapSize\": 500}", "",
     "c.json: renderer.shadowMapSize: the renderer's options are given twice"},
    {"/rendererOptions=\"abc\"", "", "c.json: rendererOptions: expected an even number"},
    {"/widht=960", "", "c.json: unknown key \"widht\" (did you mean \"width\"?)"},
    {"/{LONG}=1", "", "c.json: unknown key \"nnnnnnnn…n…\" (300 characters)"},
    {"/layers={}", "", "c.json: layers: expected"},
    {"/layers/-=5", "", "c.json: layers[6]: expected"},
    {"/layers/-={}", "", "c.json: layers[6].kind: is required"},
    // A layer's settings.
    {"/layers/3/kind=\"sprite\"", "", "c.json: layers[3].kind: unknown value \"sprite\""},
    {"-/layers/3/kind", "", "c.json: layers[3].kind: is required"},
    {"/layers/3/name=5", "", "c.json: layers[3].name: expected a string"},
    {"/layers/3/name=\"grid\"", "",
     "c.json: layers[4].name: duplicate layer name \"grid\" (layers[3] has it too)"},
    {"/layers/3/in=3", "", "c.json: layers[3].out: must be after the in time"},
    {"/layers/3/on=\"yes\"", "", "c.json: layers[3].on: expected"},
    {"/layers/3/parent=\"nobody\"", "", "c.json: layers[3].parent: "},
    {"/layers/3/parent=\"disc\"", "",
     "c.json: layers[3].parent: the parent chain loops: disc → disc"},
    {"/layers/3/parent=\"grid\" & /layers/4/parent=\"disc\"", "", "c.json: layers[3].parent: "},
    {"/layers/3/quality=\"ultra\"", "", "c.json: layers[3].quality: unknown value \"ultra\""},
    {"/layers/3/sampling=\"sinc\"", "", "c.json: layers[3].sampling: unknown value"},
    {"/layers/3/transferMode=\"glow\"", "", "c.json: layers[3].transferMode: no transfer mode"},
    {"/layers/3/preserveTransparency=\"no\"", "", "c.json: layers[3].preserveTransparency: "},
    {"/layers/3/trackMatte=\"luma\"", "", "c.json: layers[3].trackMatte: layer \"fill light\""},
    {"/layers/3/trackMatte=\"chroma\"", "", "c.json: layers[3].trackMatte: unknown value"},
    {"/layers/0/trackMatte=\"alpha\"", "", "c.json: layers[0].trackMatte: "},
    {"/layers/3/material/castsShadows=\"maybe\"", "", "c.json: layers[3].material.castsShadows: "},
    {"/layers/3/material/acceptsShadows=true", "", "c.json: layers[3].material.acceptsShadows: "},
    {"/layers/3/material/lightTransmission=200", "", "c.json: layers[3].material.lightTrans"},
    {"/layers/3/material/glossy=1", "", "c.json: layers[3].material: unknown key \"glossy\""},
    {"/layers/3/transform/position=[1, 2, 3, 4]", "", "c.json: layers[3].transform.position: "},
    {"/layers/3/transform/position=[1, \"2\"]", "", "c.json: layers[3].transform.position[1]: "},
    {"/layers/3/transform/position=[1e300, 0, 0]", "", "c.json: layers[3].transform.position"},
    {"/layers/3/transform/positon=[1, 2]", "", "c.json: layers[3].transform: unknown key"},
    {"/layers/3/transform/orientation=[0]", "", "c.json: layers[3].transform.orientation: "},
    {"/layers/3/transform/opacity=120", "", "c.json: layers[3].transform.opacity: must be betw"},
    {"/layers/3/transform/opacity={\"keyframes\": []}", "", "c.json: layers[3].transform.opac"},
    {"/layers/3/transform/opacity={\"keyframes\": [{\"time\": 1, \"value\": 5}, {\"time\": 0, "
     "\"value\": 6}]}",
     "", "c.json: layers[3].transform.opacity.keyframes[1].time: keyframe times must increase"},
    {"/layers/3/transform/opacity={\"keyframes\": [{\"time\": 0, \"value\": 5, "
     "\"interpolation\": \"bounce\"}]}",
     "", "c.json: layers[3].transform.opacity.keyframes[0].interpolation: unknown value"},
    {"/layers/3/transform/opacity={\"keyframes\": [{\"time\": 0}]}", "",
     "c.json: layers[3].transform.opacity.keyframes[0].value: is required"},
    // Cameras, lights and solids.
    {"/layers/0/camera/type=\"three-node\"", "", "c.json: layers[0].camera.type: unknown value"},
    {"/layers/0/camera/zoom=0", "", "c.json: layers[0].camera.zoom: "},
    {"/layers/0/camera/depthOfField={\"irisShape\": \"circle\"}", "",
     "c.json: layers[0].camera.depthOfField.irisShape: unknown value \"circle\""},
    {"/layers/0/camera/depthOfField={\"irisAspect\": 0}", "",
     "c.json: layers[0].camera.depthOfField.irisAspect: "},
    {"/layers/0/material={}", "", "c.json: layers[0].material: does not apply to a camera layer"},
    {"/layers/0/source=\"disc.png\"", "", "c.json: layers[0]"},
    {"/layers/1/light/type=\"laser\"", "", "c.json: layers[1].light.type: unknown value"},
    {"/layers/1/light/coneAngle=200", "", "c.json: layers[1].light.coneAngle: "},
    {"/layers/1/light/falloff=\"linear\"", "", "c.json: layers[1].light.falloff: unknown value"},
    {"/layers/1/light/shadowDarkness=101", "", "c.json: layers[1].light.shadowDarkness: "},
    {"/layers/1/light/castsShadows=\"on\"", "", "c.json: layers[1].light.castsShadows: expected"},
    {"/layers/5/source/color=[1, 1]", "", "c.json: layers[5].source.color: "},
    {"/layers/5/source/unbounded=true", "", "c.json: layers[5].source.width: an unbounded solid"},
    {"/layers/5/source=\"floor.png\"", "", "c.json: layers[5].source: expected"},
    {"/layers/3/source={\"color\": [1, 1, 1]}", "", "c.json: layers[3].source: expected"},
    // Image files.
    {"/layers/3/source=\"gone.png\"", "",
     "c.json: layers[3].source: cannot read image '…/gone.png': no such file"},
    {"/layers/3/source=\"\"", "", "c.json: layers[3].source: expected the path of an image file"},
    {"/layers/3/source=\"folder.png\"", "", "…folder.png': not a regular file"},
    {"/layers/3/source=\"fifo.png\"", "", "…fifo.png': not a regular file"},
    {"/layers/3/source=\"/dev/zero\"", "", "c.json: layers[3].source: …/dev/zero': not a regular"},
    {"/layers/3/source=\"text.png\"", "",
     "c.json: layers[3].source: cannot read image '…text.png': "},
    {"/layers/3/source=\"cut.png\"", "", "…cut.png': the PNG file is cut short at byte"},
    {"/layers/3/source=\"cut.jpg\"", "", "…cut.jpg': "},
    {"/layers/3/source=\"cut.tif\"", "", "…cut.tif': "},
    {"/layers/3/source=\"cut.exr\"", "", "…cut.exr': "},
    {"/layers/3/source=\"checksum.png\"", "",
     "c.json: layers[3].source: …checksum.png': …(frame 0)"},
    {"/layers/3/source=\"huge.ppm\"", "",
     "…huge.ppm': the image is 100000 × 100000 pixels of 3 channels; decoding it needs 260.8 GiB, "
     "more than this machine's"},
    {"/layers/3/source=\"wide.ppm\"", "",
     "c.json: layers[3].source: the image is 40000 × 1 pixels; sides must be 1 to 30000"},
    {"/layers/3/source=\"{LONG}.png\"", "", "…: File name too long"},
    {"/layers/3/source=\"a\\u0000b.png\"", "", "c.json: layers[3].source: a string with a NUL"},
    {"/layers/3/source=5", "", "c.json: layers[3].source: expected"},
    // Composition files that are not one.
    {"", "render broken.json",
     "broken.json: malformed JSON: line 1, column 24: syntax error while parsing value"},
    {"", "render empty.json", "empty.json: malformed JSON"},
    {"", "render binary.json", "binary.json: malformed JSON"},
    {"", "render list.json", "list.json: expected"},
    {"", "render nested.json", "nested.json: malformed JSON"},
    {"", "render large.json", "large.json: larger than 64 MiB, too large for a composition"},
    {"", "render gone.json", "gone.json: "},
    {"", "render $(head -c 300 /dev/zero | tr '\\0' n).json",
     "nnn.json: cannot open: File name too long"},
    {"", "render folder.png", "folder.png: not a regular file"},
    {"", "render fifo.json", "fifo.json: not a regular file"},
    {"", "info /dev/null", "/dev/null: not a regular file"},
    {"", "info c.json --frame 48", "c.json: --frame 48: the composition has frames 0-47"},
    // Frame times beyond what a time value holds.
    {"/duration=86400 & /frameRate=[999999, 1000]", "render c.json --frames 3000001 -o f.####.png",
     "c.json: frame 3000001: its time, 3000001 × 1000/999999 s, is beyond what a time value"},
    // Command lines.
    {"", "render c.json -o ''", "--output: an empty value"},
    {"", "render c.json --frames ''", "--frames: an empty value"},
    {"", "render c.json --frames 5-2", "c.json: --frames: "},
    {"", "render c.json --frames 48", "c.json: --frames: the frame range 48 reaches outside"},
    {"", "render c.json --frames last", "c.json: --frames: \"last\" is not a frame range"},
    {"", "render c.json --downsample ''", "--downsample: an empty value"},
    {"", "render c.json --downsample 0", "--downsample: \"0\" is not a downsample factor"},
    {"", "render c.json --downsample 2x", "--downsample: \"2x\" is not a downsample factor"},
    {"", "render c.json --region 0,0,2000,10", "c.json: render settings: a region of interest"},
    {"", "render c.json --region 1,2,3", "--region: "},
    {"", "render c.json --depth 12", "--depth: 12 not in {8,16,32}"},
    {"", "render c.json --frames 0 --max-memory 4M",
     "MiB and may hold at most 4.0 MiB (--max-memory)"},
    {"", "render c.json --max-memory lots", "--max-memory: \"lots\" is not a size of memory"},
    {"", "render c.json --threads 300", "--threads: "},
    {"", "render c.json --fields sideways", "--fields: "},
    {"", "render c.json --multiprocessing maybe", "--multiprocessing: "},
    {"", "render c.json --plugins ''", "--plugins: an empty value"},
    {"", "render c.json --colour red", "colour"},
    {"", "render", "COMP is required"},
    {"", "draw c.json", "A subcommand is required"},
    {"", "render c.json --frames 0 -o taken/f.0000.png/f.####.png",
     "taken/f.0000.png/f.0000.png: "},
    {"", "render c.json --frames 0 -o f.####.xyz", "f.0000.xyz: "},
    {"", "render c.json --frames 0 -o f.####.sgi", "f.0000.sgi: "},
};

// What one run left: its status, its error output, and the entries of its folder before and
// after.
struct Outcome {
    int status = 0;
    std::string errors;
    std::set<std::string> before, after;
};

// Each case runs in a folder of its own that links to the shared files, so that cases can run
// side by side: starting the program is most of a case's cost.
Outcome RunCase(const Case& c, const fs::path& shared, const fs::path& folder, const Json& cards) {
    fs::create_directory(folder);
    for (const auto& entry : fs::directory_iterator(shared))
        fs::create_symlink(entry.path(), folder / entry.path().filename());
    std::ofstream(folder / "c.json") << Edited(cards, c.edits).dump(2);
    std::string arguments = *c.arguments ? c.arguments : "render c.json --frames 0 -o f.####.png";
    Outcome outcome;
    outcome.before = Entries(folder);
    fs::path errors = folder.string() + ".err";
    std::string command = "cd '" + folder.string() + "' && '" OSTREL_PROGRAM "' " + arguments +
                          " >/dev/null 2>'" + errors.string() + "'";
    outcome.status = std::system(command.c_str());
    outcome.errors = ReadAll(errors);
    outcome.after = Entries(folder);
    return outcome;
}

TEST(BadInput, OneLineNamingTheProblemAndNoFileLeft) {
    TempFolder shared, runs;
    MakeFiles(shared);
    const Json cards = Json::parse(ReadAll(shared.Path() / "cards.json"));
    const std::set<std::string> sharedBefore = Entries(shared.Path());
    constexpr size_t kCount = std::size(kCases);
    EXPECT_GE(kCount, 100u);
    std::vector<Outcome> outcomes(kCount);
    std::atomic<size_t> next = 0;
    auto work = [&] {
        for (size_t i; (i = next++) < kCount;)
            outcomes[i] = RunCase(kCases[i], shared.Path(), runs.Path() / std::to_string(i), cards);
    };
    std::vector<std::thread> workers;
    for (int w = 0; w < 4; ++w)
        workers.emplace_back(work);
    for (std::thread& worker : workers)
        worker.join();

    for (size_t i = 0; i < kCount; ++i) {
        const Case& c = kCases[i];
        const Outcome& o = outcomes[i];
        SCOPED_TRACE(std::string(c.edits) + " | " + c.arguments);
        EXPECT_TRUE(WIFEXITED(o.status) && WEXITSTATUS(o.status) != 0) << o.status;
        EXPECT_EQ(o.errors.rfind("ostrel: ", 0), 0u) << o.errors;
        EXPECT_EQ(o.errors.find('\n'), o.errors.size() - 1) << o.errors;
        size_t at = 0;
        std::string_view parts = c.message;
        for (size_t end; at != std::string::npos && !parts.empty(); parts.remove_prefix(end)) {
            end = std::min(parts.find("…"), parts.size());
            at = o.errors.find(parts.substr(0, end), at);
            if (end < parts.size()) end += std::string_view("…").size();
        }
        EXPECT_NE(at, std::string::npos) << "expected: " << c.message << "\n     got: " << o.errors;
        EXPECT_EQ(o.after, o.before);
    }
    EXPECT_EQ(Entries(shared.Path()), sharedBefore);
}

}  // namespace
}  // namespace ostrel
