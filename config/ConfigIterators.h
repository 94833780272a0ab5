// Iterators over the sections of a configuration and over the keys of one section. Each
// holds copies of what it lists, so it is independent of later changes and needs no lock;
// one iterator is used by one thread. Name/Key/Value are called only while AtEnd is false.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace ph_fwk {

class ConfigSectionIter {
public:
    virtual ~ConfigSectionIter() = default;
    virtual bool Next() = 0;
    virtual bool AtEnd() const = 0;
    virtual std::string Name() const = 0;
};

class ConfigKeyIter {
public:
    virtual ~ConfigKeyIter() = default;
    virtual bool Next() = 0;
    virtual bool AtEnd() const = 0;
    virtual std::string Key() const = 0;
    virtual std::string Value() const = 0;
};

class FileIO_SectionIterator : public ConfigSectionIter {
public:
    explicit FileIO_SectionIterator(std::vector<std::string> names);
    bool Next() override;
    bool AtEnd() const override;
    std::string Name() const override;

private:
    std::vector<std::string> m_names;
    size_t m_nPosition = 0;
};

class FileIO_KeyIterator : public ConfigKeyIter {
public:
    explicit FileIO_KeyIterator(std::vector<std::pair<std::string, std::string>> pairs = {});
    bool Next() override;
    bool AtEnd() const override;
    std::string Key() const override;
    std::string Value() const override;

private:
    std::vector<std::pair<std::string, std::string>> m_pairs;
    size_t m_nPosition = 0;
};

}  // namespace ph_fwk

namespace nQVEmbCfg {

class tNullSectionIterator : public ph_fwk::ConfigSectionIter {
public:
    bool Next() override { return false; }
    bool AtEnd() const override { return true; }
    std::string Name() const override { return std::string(); }
};

class tNullKeyIterator : public ph_fwk::ConfigKeyIter {
public:
    bool Next() override { return false; }
    bool AtEnd() const override { return true; }
    std::string Key() const override { return std::string(); }
    std::string Value() const override { return std::string(); }
};

}  // namespace nQVEmbCfg
