#include <dlfcn.h>
#include <elf.h>
#include <fcntl.h>
#include <link.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>

#include "host/core/handle_registry.h"
#include "host/core/handles.h"
#include "host/core/host.h"
#include "host/core/provider.h"
#include "tqr/log.h"
#include "tqr/plugin.h"

namespace NQORTQR20 {
namespace {

/// The plug-in that is being loaded, as far as it has come.
struct Registration {
    TCPluginCallbacks* context = nullptr;
    fdrPluginCallbacks callbacks{};
    bool done = false;
};

Registration* gLoading = nullptr;  // null but while Plugin's constructor loads a library

std::vector<Notice>& Notices() {
    static std::vector<Notice> notices;
    return notices;
}

struct CloseLibrary {
    void operator()(void* library) const { dlclose(library); }
};
using Library = std::unique_ptr<void, CloseLibrary>;

/// Libraries that stay in the process after they were closed, as those with unique symbols do. They
/// register only once; a later load finds here what they registered then.
std::map<void*, fdrPluginCallbacks>& Residents() {
    static std::map<void*, fdrPluginCallbacks> residents;
    return residents;
}

PluginSettings& Settings() {
    static PluginSettings settings;
    return settings;
}

std::string PathOfPlugin(const std::filesystem::path& folder) {
    return (folder / "ipmisel").string();
}

/// Calls into the plug-in; an exception that it lets out becomes its result.
template <typename Call, typename Result>
Result Contained(Call call, Result failed) {
    std::string what = "an unknown exception";
    try {
        return call();
    } catch (const std::exception& exception) {
        what = exception.what();
    } catch (...) {
    }
    fdrWriteLog(ILogger::kError, ("Plug-in ended by an exception: " + what).c_str());
    return failed;
}

/// "major.minor"; empty when the text is none.
std::optional<std::pair<unsigned, unsigned>> ParseVersion(std::string_view text) {
    unsigned major = 0;
    unsigned minor = 0;
    const char* const end = text.data() + text.size();
    const auto first = std::from_chars(text.data(), end, major);
    if (first.ec != std::errc() || first.ptr == end || *first.ptr != '.') return std::nullopt;
    const auto second = std::from_chars(first.ptr + 1, end, minor);
    if (second.ec != std::errc() || second.ptr != end) return std::nullopt;
    return std::pair(major, minor);
}

/// Whether this host has what a plug-in of that interface version uses.
bool IsSupported(std::string_view version) {
    const auto own = ParseVersion(fdrPluginInterfaceVersion);
    const auto wanted = ParseVersion(version);
    return wanted && wanted->first == own->first && wanted->second <= own->second;
}

/// What a plug-in's table says, copied. Empty when the table is not as tqr/classes.h has it.
std::optional<std::vector<ClassInfo>> CopyClasses(const fdrClassTable& table) {
    const auto text = [](const char* value) { return std::string(value == nullptr ? "" : value); };
    if (table.size != sizeof table || table.classInfoSize != sizeof(fdrClassInfo) ||
        (table.classes == nullptr && table.classCount > 0) ||
        (table.neededFiles == nullptr && table.neededFileCount > 0)) {
        return std::nullopt;
    }
    std::vector<ClassInfo> classes;
    for (const fdrClassInfo& row : std::span(table.classes, table.classCount)) {
        ClassInfo& copy = classes.emplace_back();
        copy.name = text(row.name);
        copy.description = text(row.description);
        copy.marks = row.marks;
        copy.nodeProperty = text(row.nodeProperty);
        copy.exporter = text(row.exporter);
        if (copy.name.empty() || copy.description.empty() ||
            (row.properties == nullptr && row.propertyCount > 0) ||
            (copy.Is(kPerLogRecord) && copy.nodeProperty.empty())) {
            return std::nullopt;
        }
        for (const auto& property : std::span(row.properties, row.propertyCount)) {
            if (property.name == nullptr || property.description == nullptr ||
                property.type > fdrPropertyType::kReference) {
                return std::nullopt;
            }
            copy.properties.push_back({property.name, property.type, property.description});
        }
    }
    return classes;
}

/// What keeps a file from being loaded that the loader would not survive: a part that the file is
/// too short for is mapped all the same, and ends the process when it is read.
std::string ProblemOfFile(const std::filesystem::path& path) {
    // Not blocking: nobody may write to a pipe.
    const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
        descriptor < 0 ? nullptr : fdopen(descriptor, "r"), std::fclose);
    struct stat status {};
    if (!file || fstat(descriptor, &status) != 0) {
        return std::string(std::strerror(errno)) + "; name another with --plugin";
    }
    if (!S_ISREG(status.st_mode)) return "it is no file; name another with --plugin";
    const auto size = static_cast<std::uint64_t>(status.st_size);
    ElfW(Ehdr) header{};
    if (std::fread(&header, 1, sizeof header, file.get()) != sizeof header ||
        std::memcmp(header.e_ident, ELFMAG, SELFMAG) != 0 ||
        header.e_phentsize != sizeof(ElfW(Phdr))) {
        return {};  // the loader says what it is
    }
    if (std::fseek(file.get(), static_cast<long>(header.e_phoff), SEEK_SET) != 0) return {};
    for (unsigned i = 0; i < header.e_phnum; ++i) {
        ElfW(Phdr) part{};
        const bool whole = std::fread(&part, 1, sizeof part, file.get()) == sizeof part;
        if (!whole || part.p_offset > size || part.p_filesz > size - part.p_offset) {
            return "it is cut short; reinstall it or name another with --plugin";
        }
    }
    return {};
}

std::string LoaderMessage() {
    const char* const message = dlerror();
    return message == nullptr ? "unknown reason" : message;
}

}  // namespace

TTQRStatusCode fdrRegisterPlugin(fdrPluginCallbacks* record, TCPluginCallbacks** context) {
    if (record == nullptr || context == nullptr || gLoading == nullptr || gLoading->done ||
        record->size != sizeof *record || record->initialise == nullptr ||
        record->deinitialise == nullptr || record->getData == nullptr ||
        record->getInfo == nullptr) {
        return {kStatusFailed};
    }
    gLoading->callbacks = *record;
    gLoading->done = true;
    *context = gLoading->context;
    return {kStatusOk};
}

TTQRStatusCode fdrGetHandle(TCPluginCallbacks* context, const TPluginManagerProvider** provider) {
    static const TPluginManagerProvider theProvider{&GetMachineFacts()};
    if (provider == nullptr) return {kStatusFailed};
    *provider = nullptr;
    if (!tqrhost::HandleRegistry<TCPluginCallbacks>::Is(context)) return {kStatusFailed};
    *provider = &theProvider;
    return {kStatusOk};
}

TTQRStatusCode fdrGetPluginPath(TCPluginCallbacks* context, const char** path) {
    if (path == nullptr) return {kStatusFailed};
    *path = nullptr;
    if (!tqrhost::HandleRegistry<TCPluginCallbacks>::Is(context)) return {kStatusFailed};
    *path = context->path.c_str();
    return {kStatusOk};
}

TTQRStatusCode fdrShowNotice(TCPluginCallbacks* context, const char* plainText,
                             const char* markupText) {
    if (!tqrhost::HandleRegistry<TCPluginCallbacks>::Is(context) || plainText == nullptr) {
        return {kStatusFailed};
    }
    Notices().push_back({plainText, markupText == nullptr ? "" : markupText});
    return {kStatusOk};
}

TTQRStatusCode fdrGetOption(TCPluginCallbacks* context, const char* name, const char** value) {
    if (value == nullptr) return {kStatusFailed};
    *value = nullptr;
    if (!tqrhost::HandleRegistry<TCPluginCallbacks>::Is(context) || name == nullptr)
        return {kStatusFailed};
    const auto option = Settings().options.find(std::string_view(name));
    if (option != Settings().options.end()) *value = option->second.c_str();
    return {kStatusOk};
}

TTQRStatusCode fdrGetSystemName(TCPluginCallbacks* context, int node, const char** name) {
    if (name == nullptr) return {kStatusFailed};
    *name = nullptr;
    if (!tqrhost::HandleRegistry<TCPluginCallbacks>::Is(context)) return {kStatusFailed};
    const auto& names = Settings().systemNames;
    const auto index = static_cast<std::size_t>(node);
    if (node >= 0 && index < names.size()) *name = names[index].c_str();
    return {kStatusOk};
}

void SetPluginSettings(PluginSettings settings) { Settings() = std::move(settings); }

std::vector<Notice> TakeNotices() { return std::exchange(Notices(), {}); }

struct Plugin::Impl {
    std::filesystem::path file;
    std::unique_ptr<TCPluginCallbacks> context;
    Library library;
    std::optional<fdrPluginCallbacks> callbacks;  ///< once it has registered
    std::vector<ClassInfo> classes;
    std::vector<std::pair<std::string, std::uint64_t>> neededFiles;  ///< name and greatest size

    Impl() = default;
    Impl(const Impl&) = delete;
    Impl& operator=(const Impl&) = delete;
    ~Impl() {
        void* const identity = library.get();
        library.reset();
        if (!callbacks) return;
        const Library resident(dlopen(file.c_str(), RTLD_NOW | RTLD_NOLOAD));
        if (resident) Residents()[identity] = *callbacks;
    }
};

Plugin::Plugin(const std::filesystem::path& file) : impl_(std::make_unique<Impl>()) {
    const auto fail = [&file](const std::string& why) {
        std::string line = "cannot load the plug-in " + file.string() + ": " + why;
        std::replace(line.begin(), line.end(), '\n', ' ');
        throw PluginError(line);
    };
    std::error_code error;
    impl_->file = std::filesystem::canonical(file, error);
    if (error) fail(error.message() + "; install it there or name another with --plugin");
    impl_->context = std::make_unique<TCPluginCallbacks>(PathOfPlugin(impl_->file.parent_path()));

    if (const std::string problem = ProblemOfFile(impl_->file); !problem.empty()) fail(problem);
    Registration registration{.context = impl_->context.get()};
    gLoading = &registration;
    impl_->library.reset(dlopen(impl_->file.c_str(), RTLD_NOW | RTLD_LOCAL));
    gLoading = nullptr;
    if (!impl_->library) {
        fail("it is no library that can be loaded here (" + LoaderMessage() +
             "); reinstall it or name another with --plugin");
    }
    if (registration.done) {
        impl_->callbacks = registration.callbacks;
    } else if (const auto resident = Residents().extract(impl_->library.get())) {
        impl_->callbacks = resident.mapped();
    } else {
        fail("it does not register itself with this host; name a plug-in with --plugin");
    }

    const std::string version = Info().interfaceVersion;
    if (!IsSupported(version)) {
        fail("it is made for version \"" + version +
             "\" of the plug-in interface and this host has " + fdrPluginInterfaceVersion +
             "; name one that fits with --plugin");
    }
    if (const auto* const table = static_cast<const fdrClassTable*>(Symbol("fdrPluginClasses"))) {
        auto classes = CopyClasses(*table);
        if (!classes) fail("its table of classes is damaged; reinstall it");
        impl_->classes = std::move(*classes);
        for (const auto& needed : std::span(table->neededFiles, table->neededFileCount)) {
            if (needed.name == nullptr) fail("its table of classes is damaged; reinstall it");
            impl_->neededFiles.emplace_back(needed.name, needed.maxSize);
        }
    }

    const TTQRStatusCode status =
        Contained([&] { return impl_->callbacks->initialise(impl_->context.get()); },
                  TTQRStatusCode{kStatusFailed});
    if (status.code != kStatusOk) {
        fail("it failed to initialise, status " + std::to_string(status.code) + " (" +
             status.TranslateStatusCode() + "); its log lines say more (--log-level trace)");
    }
}

void Plugin::KeepLoaded() const {
    dlopen(impl_->file.c_str(), RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE);
}

const std::vector<ClassInfo>& Plugin::Classes() const { return impl_->classes; }

void Plugin::CheckNeededFiles() const {
    for (const auto& [name, maxSize] : impl_->neededFiles) {
        const auto path = impl_->file.parent_path() / name;
        const auto fail = [&](const std::string& why) {
            throw PluginError("cannot use " + path.string() + ", which the plug-in " +
                              impl_->file.filename().string() + " needs: " + why +
                              "; reinstall it");
        };
        // Not blocking: a pipe in the file's place must not hold the collection up.
        const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
        const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
            descriptor < 0 ? nullptr : fdopen(descriptor, "r"), std::fclose);
        if (!file) fail(std::strerror(errno));
        struct stat status {};
        if (fstat(descriptor, &status) != 0) fail(std::strerror(errno));
        if (!S_ISREG(status.st_mode)) fail("it is no file");
        // Read to its end: a disk may fail in the middle.
        std::array<char, 1 << 14> part;
        std::uint64_t size = 0;
        while (const std::size_t count = std::fread(part.data(), 1, part.size(), file.get())) {
            size += count;
            if (size > maxSize) fail("it has more than " + std::to_string(maxSize) + " bytes");
        }
        if (std::ferror(file.get()) != 0) fail(std::strerror(errno));
    }
}

Plugin::~Plugin() {
    Contained([&] { return impl_->callbacks->deinitialise(impl_->context.get()); },
              TTQRStatusCode{kStatusFailed});
}

PluginInfo Plugin::Info() const {
    const auto info =
        Contained([&] { return impl_->callbacks->getInfo(impl_->context.get()); }, fdrPluginInfo{});
    const auto text = [](const char* value) { return std::string(value == nullptr ? "" : value); };
    return {text(info.name), text(info.version), text(info.interfaceVersion)};
}

std::string Plugin::ProblemOfOption(const std::string& name, const std::string& value) const {
    const auto check = reinterpret_cast<fdrCheckOption>(Symbol("fdrPluginCheckOption"));
    if (check == nullptr) return {};
    std::array<char, 512> problem{"it is refused"};
    const auto size = static_cast<std::uint32_t>(problem.size() - 1);
    const TTQRStatusCode status =
        Contained([&] { return check(name.c_str(), value.c_str(), problem.data(), size); },
                  TTQRStatusCode{kStatusFailed});
    return status.code == kStatusOk ? std::string() : std::string(problem.data());
}

TTQRStatusCode Plugin::Collect(const std::vector<std::string>& classNames, InstanceSink& sink) {
    OutputHandle output(sink);
    std::vector<const char*> names;
    names.reserve(classNames.size());
    for (const std::string& name : classNames) names.push_back(name.c_str());
    return Contained(
        [&] {
            return impl_->callbacks->getData(impl_->context.get(), output.get(), names.data(),
                                             static_cast<int>(names.size()));
        },
        TTQRStatusCode{kStatusFailed});
}

void* Plugin::Symbol(const char* name) const { return dlsym(impl_->library.get(), name); }

std::optional<int> Plugin::RunExporter(const char* name, InstanceSink& sink) {
    using Exporter = int (*)(TCPluginCallbacks*, fdriIOHandle*);
    const auto exporter = reinterpret_cast<Exporter>(Symbol(name));
    if (exporter == nullptr) return std::nullopt;
    OutputHandle output(sink);
    return Contained([&] { return exporter(impl_->context.get(), output.get()); },
                     int{kStatusFailed});
}

PluginContext::PluginContext(const std::filesystem::path& pluginFolder)
    : context_(std::make_unique<TCPluginCallbacks>(PathOfPlugin(pluginFolder))) {}
PluginContext::~PluginContext() = default;

}  // namespace NQORTQR20
