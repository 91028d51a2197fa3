// tov: the command-line host of the library.
#include <new>
#include <string>
#include <variant>

#include "arguments.h"
#include "devices.h"
#include "failure.h"
#include "filter_listing.h"
#include "picture_reader.h"
#include "picture_writer.h"
#include "pipeline.h"
#include "streams.h"
#include "user_directories.h"

namespace tool {

namespace {

void execute(Streams& streams, const PrintCommand& command) {
    streams.result(command.text);
}

void execute(Streams& streams, const DevicesCommand& /*command*/) {
    streams.result(listDevices());
}

void execute(Streams& streams, const FiltersCommand& command) {
    const Handle context = openDevice(chooseDevice(std::nullopt), nullptr);
    streams.result(listFilters(context.get(), command.filter, command.markdown));
}

Handle openForWork(Streams& streams, const WorkArguments& work) {
    const std::string cache = cacheDirectory(work.cache);
    const DeviceChoice device = chooseDevice(work.device);
    Handle context = openDevice(device, cache.c_str());
    streams.forgetLibraryLines();
    if (work.verbose) {
        note("device " + deviceName(device) + ": " + describeDevice(context.get()));
        note("compiled kernels are kept in " + cache);
    }
    return context;
}

void tellOfPicture(const WorkArguments& work, const Picture& picture) {
    if (!work.verbose) return;
    note(work.input + ": " + std::to_string(picture.width) + " x " + std::to_string(picture.height) + " pixels, " +
         std::to_string(picture.channels.size()) + " channels");
}

void write(PictureWriter& writer, const WorkArguments& work, const Picture& picture) {
    writer.write(picture);
    if (work.verbose) note("wrote " + work.output);
}

// Whatever can be found wrong is found before the first pixel is worked on.
void execute(Streams& streams, const RunCommand& command) {
    const WorkArguments& work = command.work;
    streams.setVerbose(work.verbose);
    PictureWriter writer(work.output);
    const Handle context = openForWork(streams, work);
    std::vector<PreparedStage> stages = prepareStages(context.get(), command.stages);
    Picture picture = readFileOrLayer(work.input);
    tellOfPicture(work, picture);
    AuxiliaryImages auxiliary(streams, context.get());
    readImages(stages, auxiliary, {picture.width, picture.height}, work.input);
    runStages(streams, context.get(), stages, command.fuse, picture);
    write(writer, work, picture);
}

void execute(Streams& streams, const DenoiseCommand& command) {
    const WorkArguments& work = command.work;
    streams.setVerbose(work.verbose);
    PictureWriter writer(work.output);
    const Handle context = openForWork(streams, work);
    DenoiseInputs inputs = readDenoiseInputs(work.input, command.options);
    tellOfPicture(work, inputs.color);
    denoise(streams, context.get(), inputs, command.options);
    write(writer, work, inputs.color);
}

ExitStatus runTool(Streams& streams, int argc, const char* const* argv) {
    std::string message;
    ExitStatus status = ExitStatus::kFailed;
    try {
        const Command command = parseArguments(argc, argv);
        std::visit([&](const auto& chosen) { execute(streams, chosen); }, command);
        streams.takeLibraryLines();
        return ExitStatus::kDone;
    } catch (const Failure& failure) {
        message = failure.what();
        status = failure.status();
    } catch (const std::bad_alloc&) {
        message = "the memory of this machine is not enough";
    } catch (const std::exception& error) {
        message = error.what();
    }
    if (status == ExitStatus::kFailed || status == ExitStatus::kNoDevice) streams.showLibraryLines();
    complain(message);
    return status;
}

}  // namespace

}  // namespace tool

int main(int argc, char** argv) {
    tool::Streams streams;
    return static_cast<int>(tool::runTool(streams, argc, argv));
}
