#pragma once

#include <corvane/Platform/Task.h>

#include <cstddef>
#include <memory>
#include <utility>

namespace corvane {

/// A first-in, first-out list of tasks in chunks: nothing is moved when it grows, the whole list is
/// taken over in a few pointer writes, and one emptied chunk is kept so that a queue in steady use
/// does not allocate. Not thread-safe.
class TaskList {
  public:
    TaskList() noexcept = default;
    TaskList(const TaskList&) = delete;
    TaskList& operator=(const TaskList&) = delete;
    ~TaskList() {
        while (head_) removeFirstChunk();
    }

    [[nodiscard]] bool empty() const noexcept { return !head_; }

    void push(Task&& task) {
        if (!tail_ || tail_->end == chunkSize) addChunk();
        tail_->tasks[tail_->end++] = std::move(task);
    }

    /// Requires: the list is not empty.
    Task pop() noexcept {
        Task task = std::move(head_->tasks[head_->begin++]);
        if (head_->begin == head_->end) removeFirstChunk();
        return task;
    }

    /// Exchanges the tasks of two lists. The spare chunk goes to the list that will be pushed to:
    /// `other` becomes the empty one in the only use there is, a worker that takes what is waiting.
    void takeAll(TaskList& other) noexcept {
        std::swap(head_, other.head_);
        std::swap(tail_, other.tail_);
        if (!other.spare_) other.spare_ = std::move(spare_);
    }

  private:
    static constexpr std::size_t chunkSize = 63;
    struct Chunk {
        std::size_t begin = 0;
        std::size_t end = 0;
        std::unique_ptr<Chunk> next;
        Task tasks[chunkSize];
    };

    void addChunk() {
        auto chunk = spare_ ? std::move(spare_) : std::make_unique<Chunk>();
        Chunk* added = chunk.get();
        if (tail_) {
            tail_->next = std::move(chunk);
        } else {
            head_ = std::move(chunk);
        }
        tail_ = added;
    }

    void removeFirstChunk() noexcept {
        auto chunk = std::move(head_);
        head_ = std::move(chunk->next);
        if (!head_) tail_ = nullptr;
        chunk->begin = chunk->end = 0;
        if (!spare_) spare_ = std::move(chunk);
    }

    std::unique_ptr<Chunk> head_;
    Chunk* tail_ = nullptr;
    std::unique_ptr<Chunk> spare_;
};

}  // namespace corvane
