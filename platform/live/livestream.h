// SPDX-License-Identifier: Apache-2.0
//
// Live streams of cameras: ring buffers of frames in shared memory, filled by the recording service.
#pragma once

#include <cstdint>

#include "platform/export.h"

// The head of one frame in a ring; its data follows directly. The picture or audio block is the length - offset bytes
// that begin offset bytes into the data.
struct DataEntry {
    std::int32_t m_Length;  // bytes of data, including the offset's
    std::int32_t m_SeqNo;   // 0 … 10000, then 0 again
    std::int32_t m_Offset;  // 0 … length
    std::uint32_t m_Flags;  // DATA_ENTRY_KEY_FRAME
    std::uint32_t m_TimestampLow;
    std::uint32_t m_TimestampHigh;  // with the low word: microseconds of a clock common to video and audio
    std::uint32_t m_Reserved[5];    // private to the recording service
};
static_assert(sizeof(DataEntry) == 44, "frame data begins 44 bytes after its entry");

constexpr std::uint32_t DATA_ENTRY_KEY_FRAME = 2;

// A sequence number that no entry has: nothing read yet.
constexpr int DATA_ENTRY_SEQ_NONE = 10001;

// One reader's position in one ring. The caller owns it; only the ring reads and writes its contents.
struct __tag_DATA_ENTRY_INFO {
    std::uint64_t m_Count = 0;   // frames written to the ring up to the last one read
    std::int32_t m_Reader = -1;  // the reader's slot in the ring's table
    std::int32_t m_Pinned = -1;  // the entry being sent
    std::uint32_t m_Generation = 0;
};

// A ring at the address where it is attached: the pointer itself is what shmdt takes.
//
// An entry that a read call returns is not overwritten until the matching finish call; the writer skips it and never
// waits. A null position stands for one reader per process. No call blocks for longer than 100 ms.
//
// Thread safety: one thread per position, any number of readers and processes.
class LH_PLATFORM_API ShmStreamFifo {
  public:
    ShmStreamFifo() = delete;

    // Registers the position as a reader of the ring; reads nothing.
    void StartRead(__tag_DATA_ENTRY_INFO* position);
    // The newest entry whatever was read before, or null when the ring is empty.
    DataEntry* ReadLatest();
    // The newest entry if its number differs from lastSeq (numbers wrap, so "newer" is not compared), else null. May
    // wait up to 100 ms for one, and before that as long for the client's connection to drain: null, too, while it has
    // not. A signal ends the wait.
    DataEntry* ReadLatest(int lastSeq, __tag_DATA_ENTRY_INFO* position);
    // The entry after lastSeq, or null when that is the newest; the newest key frame, or the newest audio entry, when
    // lastSeq has been overwritten or names no entry. Of video it may wait up to 100 ms while neither it nor the audio
    // ring that is read beside it holds anything unread; a signal ends the wait. Of video it is null, too, while the
    // client's connection has not drained; and where that made the stream more than two seconds late, it skips to the
    // first key frame that is not.
    DataEntry* ReadNext(int lastSeq, __tag_DATA_ENTRY_INFO* position);
    // The newest key frame, or null.
    DataEntry* ReadLatestIFrame();
    void ReadIFrameFinish(DataEntry* entry, __tag_DATA_ENTRY_INFO* position);
    // Releases the entry; null is allowed. The flag says nothing about the medium: the module passes true for streamed
    // video, false for audio and for a single picture.
    void ReadFinish(DataEntry* entry, bool flag, __tag_DATA_ENTRY_INFO* position);
    // Unregisters the position and frees its slot.
    void StopRead(__tag_DATA_ENTRY_INFO* position);

    // The decoder configuration of a video or audio ring. length: on entry the size of data, on return the bytes
    // stored; 0 when there is none or it does not fit. H.264 and H.265: parameter sets as Annex B; AAC: its
    // AudioSpecificConfig.
    void GetVdoExtraData(unsigned char* data, int& length);
    void GetAdoExtraData(unsigned char* data, int& length);
    // "MJPEG", "H264", "H265"; "AAC", "PCMU", "PCMA", "OPUS", or empty without sound. Never null; valid while attached.
    const char* GetVdoCodec();
    const char* GetAdoCodec();
};

// Attaches the live video of the camera's stream; null when there is none or the caller may not view it. Asks the
// recording service for the stream even without StartLive, and waits at most 5 s for its first frame. The caller
// detaches with shmdt.
LH_PLATFORM_API ShmStreamFifo* LiveStreamFifoAt(int camId, int streamNo);

// Attaches the live audio of a stream whose video the caller has attached; null when it has not. Without sound, or
// without the right to hear it, a ring that stays empty. The caller detaches with shmdt.
LH_PLATFORM_API ShmStreamFifo* LiveAdoStreamFifoAt(int camId, int streamNo);

// The keep-alive of a live stream for one viewer. Destroying it does not stop the stream.
class LH_PLATFORM_API LiveStreamUpdater {
  public:
    LiveStreamUpdater(int camId, int streamNo);

    // Asks the recording service to produce the stream.
    void StartLive();
    // Tells the recording service that the viewer is still reading. A stream without a stamp for 15 s or more may stop.
    void UpdateStamp();

  private:
    int m_CamId;
    int m_StreamNo;
};
