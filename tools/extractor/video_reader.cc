#include <unistd.h>

#include <cerrno>
#include <memory>

extern "C" {
#include <libavformat/avformat.h>
#include <libavutil/dict.h>
}

#include "readers.h"
#include "xml_text.h"

namespace extractor {
namespace {

// libavformat reads the descriptor handed over, never a file by name.
int ReadPacket(void* opaque, uint8_t* buffer, int size) {
    const ssize_t got = read(*static_cast<int*>(opaque), buffer, static_cast<size_t>(size));
    return got > 0 ? static_cast<int>(got) : got == 0 ? AVERROR_EOF : AVERROR(errno);
}

int64_t Seek(void* opaque, int64_t offset, int whence) {
    const int fd = *static_cast<int*>(opaque);
    if (whence == AVSEEK_SIZE) {
        const off_t here = lseek(fd, 0, SEEK_CUR);
        const off_t end = lseek(fd, 0, SEEK_END);
        lseek(fd, here, SEEK_SET);
        return end;
    }
    return lseek(fd, static_cast<off_t>(offset), whence & ~AVSEEK_FORCE);
}

struct Closer {
    void operator()(AVFormatContext* context) const { avformat_close_input(&context); }
    void operator()(AVIOContext* io) const {
        av_freep(&io->buffer);
        avio_context_free(&io);
    }
};

void PutTag(Reply& reply, const char* field, const AVDictionary* tags, const char* key) {
    const AVDictionaryEntry* entry = av_dict_get(tags, key, nullptr, 0);
    const std::string text = entry != nullptr ? Squeezed(entry->value) : "";
    if (!text.empty()) reply.fields[field] = text;
}

}  // namespace

void ReadVideo(int fd, Reply& reply) {
    av_log_set_level(AV_LOG_QUIET);
    constexpr int kBufferSize = 1 << 16;
    auto* buffer = static_cast<unsigned char*>(av_malloc(kBufferSize));
    const std::unique_ptr<AVIOContext, Closer> io(
        buffer != nullptr ? avio_alloc_context(buffer, kBufferSize, 0, &fd, ReadPacket, nullptr, Seek) : nullptr);
    AVFormatContext* opened = avformat_alloc_context();
    if (!io || opened == nullptr || lseek(fd, 0, SEEK_SET) != 0) {
        if (!io) av_free(buffer);
        avformat_free_context(opened);
        reply.problem = "the video cannot be read";
        return;
    }
    opened->pb = io.get();
    opened->flags |= AVFMT_FLAG_CUSTOM_IO;
    if (avformat_open_input(&opened, nullptr, nullptr, nullptr) != 0) {  // frees the context on failure
        reply.problem = "the video cannot be read";
        return;
    }
    const std::unique_ptr<AVFormatContext, Closer> context(opened);
    if (avformat_find_stream_info(context.get(), nullptr) < 0) {
        reply.problem = "the video's streams cannot be read";
        return;
    }
    if (context->duration > 0) reply.fields["duration"] = static_cast<Json::Int64>(context->duration / AV_TIME_BASE);
    PutTag(reply, "title", context->metadata, "title");
    PutTag(reply, "created", context->metadata, "creation_time");
    Json::Value codecs(Json::arrayValue);
    for (unsigned i = 0; i < context->nb_streams; ++i) {
        const AVCodecParameters* codec = context->streams[i]->codecpar;
        codecs.append(avcodec_get_name(codec->codec_id));
        if (codec->codec_type == AVMEDIA_TYPE_VIDEO && !reply.fields.isMember("width")) {
            reply.fields["width"] = codec->width;
            reply.fields["height"] = codec->height;
        }
    }
    reply.fields["codecs"] = codecs;
}

}  // namespace extractor
