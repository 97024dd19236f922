// node pictures.js FOLDER: takes the pictures of the page that the documents show.
'use strict';

const {execFileSync} = require('node:child_process');
const fs = require('node:fs');
const os = require('node:os');
const path = require('node:path');
const {pathToFileURL} = require('node:url');
const {chromium} = require('playwright-core');

const kWide = {viewport: {width: 1200, height: 680}};
const kPhone = {
    viewport: {width: 360, height: 740}, deviceScaleFactor: 2, hasTouch: true, isMobile: true,
};

const kPictures = [
    {name: 'report-light', options: {...kWide, colorScheme: 'light'}, prepare: pointtogivenup},
    {name: 'report-dark', options: {...kWide, colorScheme: 'dark'}, prepare: zoomtooutage},
    {name: 'report-phone', options: {...kPhone, colorScheme: 'light'}, prepare: tapgivenup},
];

async function pointtogivenup(page) {
    const {x, y, width} = await page.locator('.row .track').first().boundingBox();
    await page.mouse.move(x + width * 0.77, y + 18);
}

async function zoomtooutage(page) {
    await page.locator('#all').focus();
    for (const key of ['Tab', 'ArrowLeft', 'ArrowLeft', 'ArrowLeft', 'Enter', '-', '-', '-']) {
        await page.keyboard.press(key);
    }
}

async function tapgivenup(page) {
    await page.locator('#axis').evaluate((axis) => axis.scrollIntoView());
    const {x, y, width} = await page.locator('.row .track').first().boundingBox();
    await page.touchscreen.tap(x + width * 0.9, y + 22);
}

// Until the page has drawn what it was last asked for.
function drawn(page) {
    return page.evaluate(() => new Promise((resolve) => {
        requestAnimationFrame(() => requestAnimationFrame(resolve));
    }));
}

async function take(browser, url, folder, {name, options, prepare}) {
    const context = await browser.newContext(options);
    const page = await context.newPage();
    await page.goto(url);
    await page.waitForSelector('html[data-drawn]');
    await prepare(page);
    await drawn(page);
    await page.screenshot({path: path.join(folder, `${name}.png`)});
    await context.close();
}

async function takeall(folder) {
    const scratch = fs.mkdtempSync(path.join(os.tmpdir(), 'tolkwd-report-pictures-'));
    const file = path.join(scratch, 'week.html');
    fs.writeFileSync(file, execFileSync(process.env.MAKEPAGE, ['week'], {maxBuffer: 2 ** 28}));
    const browser = await chromium.launch({
        executablePath: process.env.CHROMIUM, args: ['--no-sandbox'],
    });
    try {
        fs.mkdirSync(folder, {recursive: true});
        for (const picture of kPictures) {
            await take(browser, pathToFileURL(file).href, folder, picture);
        }
    } finally {
        await browser.close();
        fs.rmSync(scratch, {recursive: true, force: true});
    }
}

takeall(process.argv[2]).catch((problem) => {
    process.stderr.write(`pictures.js: ${problem.stack}\n`);
    process.exitCode = 1;
});
