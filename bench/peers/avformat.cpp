// libavformat: the tags of a media file.

extern "C" {
#include <libavformat/avformat.h>
}

#include "bench/Runner.h"

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    av_log_set_level(AV_LOG_QUIET);
    return parvel::bench::runOver(arguments, [](const std::string& path) {
        AVFormatContext* context = nullptr;
        if (avformat_open_input(&context, path.c_str(), nullptr, nullptr) != 0)
            return false;
        const bool hasTags = av_dict_count(context->metadata) > 0;
        avformat_close_input(&context);
        return hasTags;
    });
}
