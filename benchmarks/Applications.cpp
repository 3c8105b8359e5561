#include <algorithm>
#include <array>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <librsvg/rsvg.h>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <unistd.h>
#include <vector>

#include "benchmarks/Measurement.h"
#include "benchmarks/Peer.h"
#include "benchmarks/Suite.h"
#include "benchmarks/World.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/linux/applications/LinuxApplicationRegistry.h"
#include "platform/linux/icons/ApplicationIcons.h"
#include "providers/marrowdale/apps/LocalAppLibraryManager.h"

namespace marrowdale::benchmarks {
namespace {

namespace fs = std::filesystem;

constexpr int largestVariant = 32;
constexpr unsigned largestPixels = 180;

void write(const fs::path& path, const std::string& text) {
    fs::create_directories(path.parent_path());
    if (!(std::ofstream(path, std::ios::binary) << text)) {
        throw std::runtime_error("can't write " + path.string());
    }
}

// A gradient, a blurred shadow and two hundred strokes: what icons are made of.
std::string vectorIcon() {
    std::string text =
        "<svg xmlns='http://www.w3.org/2000/svg' width='48' height='48'><defs>"
        "<linearGradient id='g'><stop offset='0' stop-color='#48c'/><stop offset='1' "
        "stop-color='#024'/></linearGradient><filter id='b'><feGaussianBlur stdDeviation='1'/>"
        "</filter></defs><rect x='4' y='5' width='40' height='40' rx='8' filter='url(#b)'/>"
        "<rect x='4' y='4' width='40' height='40' rx='8' fill='url(#g)'/>";
    for (int i = 0; i < 200; ++i) {
        text += "<path d='M" + std::to_string(8 + i % 30) + " " + std::to_string(8 + i / 7) +
                " q4 -4 8 2' stroke='#fff' stroke-opacity='.3' fill='none'/>";
    }
    return text + "</svg>";
}

// Bytes as the disk has them, by the fewest calls.
std::size_t readWhole(const std::string& path, std::vector<char>& buffer) {
    const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    const ssize_t count = file < 0 ? -1 : ::read(file, buffer.data(), buffer.size());
    if (count < 0) {
        throw std::runtime_error("can't read " + path);
    }
    ::close(file);
    return static_cast<std::size_t>(count);
}

std::vector<std::string> filesIn(const fs::path& folder) {
    std::vector<std::string> paths;
    for (const auto& entry : fs::directory_iterator(folder)) {
        paths.push_back(entry.path().string());
    }
    return paths;
}

// A home with applications, and the world over it.
class ApplicationComparison {
  public:
    explicit ApplicationComparison(Suite& suite)
        : suite_(suite),
          home_(suite.folder + "/applications"),
          applications_(std::max<std::uint64_t>(suite.sizes.folders, 20)),
          libraries_(std::min<std::uint64_t>(applications_, 100)),
          registry_({.places = places(),
                     .storageRoot = root(),
                     .icons = nullptr,
                     .documentFoldersChanged = nullptr}) {
        fs::remove_all(home_);
        fs::create_directories(root());
        fs::create_directories(home_ + "/folders");
        makeApplications();
        world_.emplace(root(), home_ + "/state", registry_);
        flat_.emplace(home_ + "/folders", home_ + "/flat-state");
        refresh();
        if (listPages(*world_, VantrelRootContainerItemIdentifier) != libraries_ ||
            listPages(*flat_, VantrelRootContainerItemIdentifier) != libraries_) {
            throw std::runtime_error("not every library is listed");
        }
    }

    void run() {
        contest_.add("refresh", [this] { return timed([&] { refresh(); }); });
        contest_.add("read entries", [this] { return timed([&] { readEntries(); }); });
        contest_.add("libraries", [this] { return timed([&] { (void)count(*world_); }); });
        contest_.add("folders", [this] { return timed([&] { (void)count(*flat_); }); });
        contest_.run(suite_.sizes.rounds * repeats);
        report();
    }

  private:
    static constexpr int repeats = 5;

    [[nodiscard]] std::string root() const { return home_ + "/Documents"; }
    [[nodiscard]] native::ApplicationPlaces places() const {
        return {.folders = {{home_ + "/entries", ApplicationKind::user}},
                .containersFolder = home_ + "/containers",
                .locale = "de_DE.UTF-8"};
    }
    void makeApplications() const {
        for (std::uint64_t i = 0; i < applications_; ++i) {
            const std::string identifier = "org.example.App" + std::to_string(i);
            write(home_ + "/entries/" + identifier + ".desktop",
                  "[Desktop Entry]\nType=Application\nName=App\nName[de]=Programm\nComment=" +
                      std::string(500, 'c') +
                      "\nIcon=app\nExec=app %U\nX-KvSupportsDocumentBrowser=true\n");
            if (i < libraries_) {
                fs::create_directories(home_ + "/containers/" + identifier + "/Documents");
                fs::create_directories(home_ + "/folders/" + identifier);
            }
        }
    }
    void refresh() {
        LocalAppLibraryManager::backgroundQueue(world_->platform()).sync([&] {
            (void)LocalAppLibraryManager::refreshAppLibraries(world_->platform());
        });
    }
    void readEntries() {
        std::size_t bytes = 0;
        for (const std::string& path : filesIn(home_ + "/entries")) {
            bytes += readWhole(path, buffer_);
        }
        if (bytes == 0) {
            throw std::runtime_error("there are no entries");
        }
    }
    static std::uint64_t count(World& world) {
        return listPages(world, VantrelRootContainerItemIdentifier);
    }
    void addRow(const std::string& what, const std::string& ours, const std::string& against,
                double target) {
        suite_.table.add({.what = what,
                          .measured = inWords(contest_.median(ours).count()),
                          .against = inWords(contest_.median(against).count()),
                          .ratio = contest_.ratio(ours, against),
                          .target = target});
    }
    void report() {
        suite_.table.heading("Applications");
        addRow("refresh over " + std::to_string(applications_) +
                   " unchanged desktop entries, against reading the files",
               "refresh", "read entries", 2.0);
        addRow("root page of " + std::to_string(libraries_) +
                   " libraries, against a page of as many folders",
               "libraries", "folders", 1.5);
    }

    Suite& suite_;
    const std::string home_;
    const std::uint64_t applications_;
    const std::uint64_t libraries_;
    native::LinuxApplicationRegistry registry_;
    std::optional<World> world_;
    std::optional<World> flat_;
    std::vector<char> buffer_ = std::vector<char>(std::size_t{1} << 16U);
    Contest contest_;
};

// The library that draws, in this process.
void drawWithLibrary(const std::string& text) {
    RsvgHandle* const handle = ::rsvg_handle_new_from_data(
        reinterpret_cast<const guint8*>(text.data()), text.size(), nullptr);  // NOLINT(*-cast)
    cairo_surface_t* const surface =
        ::cairo_image_surface_create(CAIRO_FORMAT_ARGB32, largestPixels, largestPixels);
    cairo_t* const context = ::cairo_create(surface);
    const RsvgRectangle viewport{0, 0, largestPixels, largestPixels};
    const bool isDrawn = handle != nullptr && ::rsvg_handle_render_document(
                                                  handle, context, &viewport, nullptr) != FALSE;
    ::cairo_destroy(context);
    ::cairo_surface_destroy(surface);
    if (!isDrawn) {
        throw std::runtime_error("the library draws no icon");
    }
    ::g_object_unref(handle);
}

class IconComparison {
  public:
    explicit IconComparison(Suite& suite) : suite_(suite), home_(suite.folder + "/icons") {
        fs::remove_all(home_);
        write(icon(), vectorIcon());
    }

    void run() {
        if (iconData(*icons()) == 0) {
            throw std::runtime_error("no icon was drawn");
        }
        const std::string kept = filesIn(home_ + "/cache").at(0);
        kept_.add("rendered", [this] {
            // A process that has just started has nothing in memory.
            const auto fresh = icons();
            return timed([&] { (void)iconData(*fresh); });
        });
        kept_.add("bytes", [this, kept] { return timed([&] { (void)readWhole(kept, buffer_); }); });
        kept_.run(suite_.sizes.rounds * repeats);
        contest_.add("ours", [this] { return timed([&] { draw(); }); });
        contest_.add("library",
                     [text = vectorIcon()] { return timed([&] { drawWithLibrary(text); }); });
        if (hasPeer("rsvg-convert")) {
            contest_.add("rsvg-convert", [this] { return runPeer(converterArguments()); });
        }
        contest_.run(suite_.sizes.rounds * repeats);
        report();
    }

  private:
    static constexpr int repeats = 5;

    [[nodiscard]] std::string icon() const { return home_ + "/app.svg"; }
    [[nodiscard]] static native::IconRenderer renderer() {
        const auto program = fs::read_symlink("/proc/self/exe").parent_path().parent_path() /
                             "libexec/marrowdale/marrowdale-render-icon";
        return native::IconRenderer(program.string());
    }
    [[nodiscard]] std::unique_ptr<native::ApplicationIcons> icons() const {
        return std::make_unique<native::ApplicationIcons>(
            native::IconTheme::Places{.folders = {home_}, .pixmaps = home_, .theme = {}},
            renderer(), native::IconCache(home_ + "/cache"));
    }
    [[nodiscard]] std::size_t iconData(native::ApplicationIcons& icons) const {
        const auto data = icons.iconData(icon(), largestVariant);
        return data ? data->size() : 0;
    }
    void draw() const {
        if (!renderer().render(icon(), largestPixels, native::IconRenderer::Enlarging::yes)) {
            throw std::runtime_error("the icon can't be drawn");
        }
    }
    [[nodiscard]] std::vector<std::string> converterArguments() const {
        const std::string side = std::to_string(largestPixels);
        return {"rsvg-convert", "-w", side, "-h", side, "-o", home_ + "/peer.png", icon()};
    }
    void addRow(const Contest& contest, const std::string& what, const std::string& ours,
                const std::string& against, std::optional<double> target) {
        suite_.table.add({.what = what,
                          .measured = inWords(contest.median(ours).count()),
                          .against = inWords(contest.median(against).count()),
                          .ratio = contest.ratio(ours, against),
                          .target = target});
    }
    void report() {
        suite_.table.heading("Icons");
        addRow(kept_, "thumbnail already rendered, against reading its bytes", "rendered", "bytes",
               2.0);
        if (hasPeer("rsvg-convert")) {
            addRow(contest_, "vector icon at 180 pixels, against the library's own program", "ours",
                   "rsvg-convert", 1.3);
        } else {
            suite_.table.note("`rsvg-convert` is not installed");
        }
        addRow(contest_, "the same, against the library in a process that has it loaded", "ours",
               "library", {});
    }

    Suite& suite_;
    const std::string home_;
    std::vector<char> buffer_ = std::vector<char>(std::size_t{1} << 20U);
    // Apart from the drawing: whoever came first after another process would find cold caches, and
    // the other what the first one warmed.
    Contest kept_;
    Contest contest_;
};

}  // namespace

void compareApplications(Suite& suite) {
    ApplicationComparison(suite).run();
    IconComparison(suite).run();
}

}  // namespace marrowdale::benchmarks
