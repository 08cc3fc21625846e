#include <dlfcn.h>

#include <algorithm>
#include <map>
#include <string>
#include <system_error>
#include <utility>

#include "host/core/handles.h"
#include "host/core/host.h"
#include "host/core/live.h"
#include "host/core/provider.h"
#include "tqr/log.h"
#include "tqr/plugin.h"

namespace {

using NQORTQR20::fdrPluginCallbacks;
using NQORTQR20::kStatusFailed;
using NQORTQR20::kStatusOk;
using NQORTQR20::TCPluginCallbacks;
using NQORTQR20::TTQRStatusCode;

/// The plug-in that is being loaded, as far as it has come.
struct Registration {
    TCPluginCallbacks* context = nullptr;
    fdrPluginCallbacks callbacks{};
    bool done = false;
};

Registration* gLoading = nullptr;  // null but while Plugin's constructor loads a library

std::vector<tqrhost::Notice>& Notices() {
    static std::vector<tqrhost::Notice> notices;
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
    NQORTQR20::fdrWriteLog(NQORTQR20::ILogger::kError,
                           ("Plug-in ended by an exception: " + what).c_str());
    return failed;
}

std::string LoaderMessage() {
    const char* const message = dlerror();
    return message == nullptr ? "unknown reason" : message;
}

}  // namespace

namespace NQORTQR20 {

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
    static const TPluginManagerProvider theProvider{&tqrhost::GetMachineFacts()};
    if (provider == nullptr) return {kStatusFailed};
    *provider = nullptr;
    if (!tqrhost::Live<TCPluginCallbacks>::Is(context)) return {kStatusFailed};
    *provider = &theProvider;
    return {kStatusOk};
}

TTQRStatusCode fdrGetPluginPath(TCPluginCallbacks* context, const char** path) {
    if (path == nullptr) return {kStatusFailed};
    *path = nullptr;
    if (!tqrhost::Live<TCPluginCallbacks>::Is(context)) return {kStatusFailed};
    *path = context->path.c_str();
    return {kStatusOk};
}

TTQRStatusCode fdrShowNotice(TCPluginCallbacks* context, const char* plainText,
                             const char* markupText) {
    if (!tqrhost::Live<TCPluginCallbacks>::Is(context) || plainText == nullptr) {
        return {kStatusFailed};
    }
    Notices().push_back({plainText, markupText == nullptr ? "" : markupText});
    return {kStatusOk};
}

}  // namespace NQORTQR20

namespace tqrhost {

std::vector<Notice> TakeNotices() { return std::exchange(Notices(), {}); }

struct Plugin::Impl {
    std::filesystem::path file;
    std::unique_ptr<TCPluginCallbacks> context;
    Library library;
    std::optional<fdrPluginCallbacks> callbacks;  ///< once it has registered

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

    const TTQRStatusCode status =
        Contained([&] { return impl_->callbacks->initialise(impl_->context.get()); },
                  TTQRStatusCode{kStatusFailed});
    if (status.code != kStatusOk) {
        fail("it failed to initialise, status " + std::to_string(status.code) + " (" +
             status.TranslateStatusCode() + "); its log lines say more (--log-level trace)");
    }
}

Plugin::~Plugin() {
    Contained([&] { return impl_->callbacks->deinitialise(impl_->context.get()); },
              TTQRStatusCode{kStatusFailed});
}

PluginInfo Plugin::Info() const {
    const auto info = Contained([&] { return impl_->callbacks->getInfo(impl_->context.get()); },
                                NQORTQR20::fdrPluginInfo{});
    const auto text = [](const char* value) { return std::string(value == nullptr ? "" : value); };
    return {text(info.name), text(info.version), text(info.interfaceVersion)};
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
    using Exporter = int (*)(TCPluginCallbacks*, NQORTQR20::fdriIOHandle*);
    const auto exporter = reinterpret_cast<Exporter>(Symbol(name));
    if (exporter == nullptr) return std::nullopt;
    OutputHandle output(sink);
    return Contained([&] { return exporter(impl_->context.get(), output.get()); },
                     int{kStatusFailed});
}

PluginContext::PluginContext(const std::filesystem::path& pluginFolder)
    : context_(std::make_unique<TCPluginCallbacks>(PathOfPlugin(pluginFolder))) {}
PluginContext::~PluginContext() = default;

}  // namespace tqrhost
